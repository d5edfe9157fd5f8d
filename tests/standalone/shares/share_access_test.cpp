// Real folders, and real identities taken by a child process.
#include "standalone/shares/share_access.h"

#include "platform/share.h"
#include "standalone/accounts/account_sources.h"
#include "standalone/core/state_root.h"
#include "standalone/shares/folder_access.h"
#include "tests/standalone/support/store_shares.h"
#include "tests/support/result.h"
#include "tests/support/temporary_folder.h"

#include <gtest/gtest.h>

#include <sys/stat.h>
#include <unistd.h>

#include <atomic>
#include <csignal>
#include <thread>

namespace velt {
namespace {

using test::messageOf;

constexpr uid_t ftpUid = 54321;
constexpr uid_t annaUid = 54322;
constexpr gid_t ftpGid = 54331;
constexpr gid_t staffGid = 54332;
constexpr gid_t mediaGid = 54333;

class ShareAccessTest : public testing::Test {
protected:
    void SetUp() override {
        if (geteuid() != 0) {
            GTEST_SKIP() << "only root can take another account's identity";
        }
        chmod(folder_.path().c_str(), 0755);
        AccountSources sources;
        sources.passwd = folder_.write("passwd", "ftp:x:54321:54331::/:/\nanna:x:54322:54331::/:/\n"
                                                 "root:x:0:0::/:/\n");
        sources.group = folder_.write("group", "ftp:x:54331:\nstaff:x:54332:anna\nmedia:x:54333:anna,ftp\n");
        sources.nsswitch = folder_.path() / "nsswitch.conf";
        setAccountSources(sources);
        setStateRoot(folder_.path());
        share_.name = "public";
        share_.path = (folder_.path() / "public").string();
        std::filesystem::create_directory(share_.path);
        own(0755, 0, 0);
    }
    void TearDown() override { setAccountSources({}); }

    void own(mode_t mode, uid_t uid, gid_t gid) {
        ASSERT_EQ(chown(share_.path.c_str(), uid, gid), 0);
        ASSERT_EQ(chmod(share_.path.c_str(), mode), 0);
    }

    std::optional<Access> accessFor(const std::string& account) {
        const auto access = accessOf(account, share_);
        EXPECT_EQ(messageOf(access), "");
        return access.valueOr({});
    }

    test::TemporaryFolder folder_;
    ShareEntry share_;
};

constexpr std::optional<Access> noEntry;
constexpr std::optional readWrite = Access::write;
constexpr std::optional readOnly = Access::read;
constexpr std::optional denied = Access::none;

TEST_F(ShareAccessTest, WithoutAnEntryThereIsNone) {
    own(0777, 0, 0);
    EXPECT_EQ(accessFor("ftp"), noEntry);
    EXPECT_EQ(accessFor("staff"), noEntry);
}

TEST_F(ShareAccessTest, ARefusalToAGroupThatCannotBeLookedUpIsForAll) {
    own(0777, 0, 0);
    share_.groups["media"] = Access::write;
    share_.groups["away"] = Access::read;
    EXPECT_EQ(accessFor("anna"), readWrite);
    share_.groups["away"] = Access::none;
    EXPECT_EQ(accessFor("anna"), denied);
    share_.users["anna"] = Access::read;
    EXPECT_EQ(accessFor("anna"), readOnly) << "her own entry comes first";
}

TEST_F(ShareAccessTest, AnUnknownAccountHasNoneEvenWithAnEntry) {
    share_.users["ghost"] = Access::write;
    EXPECT_EQ(accessFor("ghost"), noEntry);
    EXPECT_EQ(accessFor(""), noEntry);
    EXPECT_EQ(accessFor("ftp\n"), noEntry);
}

TEST_F(ShareAccessTest, ARefusalInTheStoreCountsWhateverTheFileSystemAllows) {
    own(0777, ftpUid, ftpGid);
    share_.users["ftp"] = Access::none;
    EXPECT_EQ(accessFor("ftp"), denied);
}

TEST_F(ShareAccessTest, TheStoreLimitsWhatTheFileSystemAllows) {
    own(0777, 0, 0);
    share_.users["ftp"] = Access::read;
    EXPECT_EQ(accessFor("ftp"), readOnly);
    share_.users["ftp"] = Access::write;
    EXPECT_EQ(accessFor("ftp"), readWrite);
}

TEST_F(ShareAccessTest, TheFileSystemLimitsWhatTheStoreGrants) {
    share_.users["ftp"] = Access::write;
    own(0755, 0, 0);
    EXPECT_EQ(accessFor("ftp"), readOnly);
    own(0700, 0, 0);
    EXPECT_EQ(accessFor("ftp"), denied);
    own(0711, 0, 0);
    EXPECT_EQ(accessFor("ftp"), denied) << "entering without listing shows an empty folder";
    own(0744, 0, 0);
    EXPECT_EQ(accessFor("ftp"), denied);
    own(0700, ftpUid, 0);
    EXPECT_EQ(accessFor("ftp"), readWrite);
    own(0333, 0, 0);
    EXPECT_EQ(accessFor("ftp"), denied);
}

TEST_F(ShareAccessTest, TheOwnersModesCountForTheOwner) {
    own(0077, ftpUid, 0);
    share_.users["ftp"] = Access::write;
    EXPECT_EQ(accessFor("ftp"), denied);
}

TEST_F(ShareAccessTest, PrimaryAndFurtherGroupsCountInTheFileSystem) {
    share_.users["ftp"] = Access::write;
    own(0770, 0, ftpGid);
    EXPECT_EQ(accessFor("ftp"), readWrite);
    own(0770, 0, mediaGid);
    EXPECT_EQ(accessFor("ftp"), readWrite);
    own(0770, 0, staffGid);
    EXPECT_EQ(accessFor("ftp"), denied);
    own(0770, 0, 0);
    EXPECT_EQ(accessFor("ftp"), denied) << "the caller's own groups must be gone";
}

TEST_F(ShareAccessTest, AFolderOnTheWayCounts) {
    const std::filesystem::path outer = folder_.path() / "outer";
    std::filesystem::create_directories(outer / "inner");
    chmod((outer / "inner").c_str(), 0777);
    share_.path = (outer / "inner").string();
    share_.users["ftp"] = Access::write;
    chmod(outer.c_str(), 0755);
    EXPECT_EQ(accessFor("ftp"), readWrite);
    chmod(outer.c_str(), 0700);
    EXPECT_EQ(accessFor("ftp"), denied);
}

TEST_F(ShareAccessTest, AMissingFolderOrAFileIsDenied) {
    share_.users["ftp"] = Access::write;
    share_.path = (folder_.path() / "missing").string();
    EXPECT_EQ(accessFor("ftp"), denied);
    share_.path = folder_.write("file", "x").string();
    chmod(share_.path.c_str(), 0777);
    EXPECT_EQ(accessFor("ftp"), denied);
}

TEST_F(ShareAccessTest, AGroupsEntryCountsForItsMembers) {
    own(0777, 0, 0);
    share_.groups["staff"] = Access::write;
    EXPECT_EQ(accessFor("anna"), readWrite);
    EXPECT_EQ(accessFor("ftp"), noEntry);
    share_.groups["media"] = Access::read;
    EXPECT_EQ(accessFor("anna"), readWrite);
    EXPECT_EQ(accessFor("ftp"), readOnly);
    share_.groups["ftp"] = Access::none;
    EXPECT_EQ(accessFor("anna"), denied) << "a refusal counts first among the groups";
}

TEST_F(ShareAccessTest, TheUsersOwnEntryDecidesBeforeTheGroups) {
    own(0777, 0, 0);
    share_.groups["staff"] = Access::none;
    share_.users["anna"] = Access::read;
    EXPECT_EQ(accessFor("anna"), readOnly);
    share_.groups["staff"] = Access::write;
    share_.users["anna"] = Access::none;
    EXPECT_EQ(accessFor("anna"), denied);
}

TEST_F(ShareAccessTest, AGroupIsCheckedAsAStrangerInIt) {
    share_.groups["staff"] = Access::write;
    own(0770, 0, staffGid);
    EXPECT_EQ(accessFor("staff"), readWrite);
    own(0750, 0, staffGid);
    EXPECT_EQ(accessFor("staff"), readOnly);
    own(0700, annaUid, staffGid);
    EXPECT_EQ(accessFor("staff"), denied);
}

TEST_F(ShareAccessTest, AnswersInAProcessThatIgnoresTheEndOfItsChildren) {
    share_.users["ftp"] = Access::read;
    const auto before = std::signal(SIGCHLD, SIG_IGN);
    EXPECT_EQ(accessFor("ftp"), readOnly);
    std::signal(SIGCHLD, before);
}

TEST_F(ShareAccessTest, LeavesTheCallersIdentityAloneAndServesManyThreads) {
    own(0750, 0, staffGid);
    share_.users["ftp"] = Access::write;
    share_.users["anna"] = Access::write;
    std::atomic<int> wrong = 0;
    std::vector<std::thread> threads;
    for (int i = 0; i < 4; ++i) {
        threads.emplace_back([&, i] {
            for (int round = 0; round < 25; ++round) {
                if (accessFor(i % 2 == 0 ? "ftp" : "anna") != (i % 2 == 0 ? denied : readOnly)) {
                    ++wrong;
                }
            }
        });
    }
    for (std::thread& thread : threads) {
        thread.join();
    }
    EXPECT_EQ(wrong, 0);
    EXPECT_EQ(geteuid(), 0U);
}

TEST_F(ShareAccessTest, TheContractFillsTheThirdWord) {
    own(0777, 0, 0);
    const std::pair<std::map<std::string, Access>, int> codes[] = {
        {{}, 0}, {{{"ftp", Access::write}}, 1}, {{{"ftp", Access::read}}, 2}, {{{"ftp", Access::none}}, 4}};
    for (const auto& [grants, code] : codes) {
        share_.users = grants;
        ASSERT_EQ(messageOf(test::storeShares({share_})), "");
        VELT_SHARE* share = nullptr;
        ASSERT_EQ(VELTShareGet("public", &share), 0);
        VELT_SHARE_PRIV privilege{{7, 7}, 7};
        EXPECT_EQ(VELTShareUGPrivGetLocal("ftp", share, &privilege), 0);
        EXPECT_EQ(privilege.effective, code);
        EXPECT_LT(VELTShareUGPrivGetLocal(nullptr, share, &privilege), 0);
        EXPECT_LT(VELTShareUGPrivGetLocal("ftp", share, nullptr), 0);
        VELTShareFree(share);
    }
}

TEST(FolderAccess, NeedsAGroup) {
    EXPECT_NE(messageOf(folderAccess("/", {"", 1, {}})), "");
}

} // namespace
} // namespace velt
