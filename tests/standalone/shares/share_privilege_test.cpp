// Real folders, and real identities taken by a child process.
#include "standalone/shares/share_privilege.h"

#include "platform/share.h"
#include "standalone/accounts/account_sources.h"
#include "standalone/core/last_error.h"
#include "standalone/core/state_root.h"
#include "standalone/shares/folder_access.h"
#include "tests/standalone/support/temporary_folder.h"

#include <gtest/gtest.h>

#include <sys/stat.h>
#include <unistd.h>

#include <atomic>
#include <csignal>
#include <thread>

namespace velt {
namespace {

constexpr uid_t ftpUid = 54321;
constexpr uid_t annaUid = 54322;
constexpr gid_t ftpGid = 54331;
constexpr gid_t staffGid = 54332;
constexpr gid_t mediaGid = 54333;

class SharePrivilegeTest : public testing::Test {
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

    int privilegeOf(const std::string& account) {
        const std::optional<SharePrivilege> privilege = privilegeOn(share_, account);
        EXPECT_TRUE(privilege) << lastErrorSentence();
        return privilege ? static_cast<int>(*privilege) : -1;
    }

    test::TemporaryFolder folder_;
    ShareEntry share_;
};

constexpr int noEntry = 0;
constexpr int readWrite = 1;
constexpr int readOnly = 2;
constexpr int denied = 4;

TEST_F(SharePrivilegeTest, WithoutAnEntryThereIsNone) {
    own(0777, 0, 0);
    EXPECT_EQ(privilegeOf("ftp"), noEntry);
    EXPECT_EQ(privilegeOf("staff"), noEntry);
}

TEST_F(SharePrivilegeTest, AnUnknownAccountHasNoneEvenWithAnEntry) {
    share_.users["ghost"] = ShareGrant::write;
    EXPECT_EQ(privilegeOf("ghost"), noEntry);
    EXPECT_EQ(privilegeOf(""), noEntry);
    EXPECT_EQ(privilegeOf("ftp\n"), noEntry);
}

TEST_F(SharePrivilegeTest, ARefusalInTheStoreCountsWhateverTheFileSystemAllows) {
    own(0777, ftpUid, ftpGid);
    share_.users["ftp"] = ShareGrant::none;
    EXPECT_EQ(privilegeOf("ftp"), denied);
}

TEST_F(SharePrivilegeTest, TheStoreLimitsWhatTheFileSystemAllows) {
    own(0777, 0, 0);
    share_.users["ftp"] = ShareGrant::read;
    EXPECT_EQ(privilegeOf("ftp"), readOnly);
    share_.users["ftp"] = ShareGrant::write;
    EXPECT_EQ(privilegeOf("ftp"), readWrite);
}

TEST_F(SharePrivilegeTest, TheFileSystemLimitsWhatTheStoreGrants) {
    share_.users["ftp"] = ShareGrant::write;
    own(0755, 0, 0);
    EXPECT_EQ(privilegeOf("ftp"), readOnly);
    own(0700, 0, 0);
    EXPECT_EQ(privilegeOf("ftp"), denied);
    own(0711, 0, 0);
    EXPECT_EQ(privilegeOf("ftp"), denied) << "entering without listing shows an empty folder";
    own(0744, 0, 0);
    EXPECT_EQ(privilegeOf("ftp"), denied);
    own(0700, ftpUid, 0);
    EXPECT_EQ(privilegeOf("ftp"), readWrite);
    own(0333, 0, 0);
    EXPECT_EQ(privilegeOf("ftp"), denied);
}

TEST_F(SharePrivilegeTest, TheOwnersModesCountForTheOwner) {
    own(0077, ftpUid, 0);
    share_.users["ftp"] = ShareGrant::write;
    EXPECT_EQ(privilegeOf("ftp"), denied);
}

TEST_F(SharePrivilegeTest, PrimaryAndFurtherGroupsCountInTheFileSystem) {
    share_.users["ftp"] = ShareGrant::write;
    own(0770, 0, ftpGid);
    EXPECT_EQ(privilegeOf("ftp"), readWrite);
    own(0770, 0, mediaGid);
    EXPECT_EQ(privilegeOf("ftp"), readWrite);
    own(0770, 0, staffGid);
    EXPECT_EQ(privilegeOf("ftp"), denied);
    own(0770, 0, 0);
    EXPECT_EQ(privilegeOf("ftp"), denied) << "the caller's own groups must be gone";
}

TEST_F(SharePrivilegeTest, AFolderOnTheWayCounts) {
    const std::filesystem::path outer = folder_.path() / "outer";
    std::filesystem::create_directories(outer / "inner");
    chmod((outer / "inner").c_str(), 0777);
    share_.path = (outer / "inner").string();
    share_.users["ftp"] = ShareGrant::write;
    chmod(outer.c_str(), 0755);
    EXPECT_EQ(privilegeOf("ftp"), readWrite);
    chmod(outer.c_str(), 0700);
    EXPECT_EQ(privilegeOf("ftp"), denied);
}

TEST_F(SharePrivilegeTest, AMissingFolderOrAFileIsDenied) {
    share_.users["ftp"] = ShareGrant::write;
    share_.path = (folder_.path() / "missing").string();
    EXPECT_EQ(privilegeOf("ftp"), denied);
    share_.path = folder_.write("file", "x").string();
    chmod(share_.path.c_str(), 0777);
    EXPECT_EQ(privilegeOf("ftp"), denied);
}

TEST_F(SharePrivilegeTest, AGroupsEntryCountsForItsMembers) {
    own(0777, 0, 0);
    share_.groups["staff"] = ShareGrant::write;
    EXPECT_EQ(privilegeOf("anna"), readWrite);
    EXPECT_EQ(privilegeOf("ftp"), noEntry);
    share_.groups["media"] = ShareGrant::read;
    EXPECT_EQ(privilegeOf("anna"), readWrite);
    EXPECT_EQ(privilegeOf("ftp"), readOnly);
    share_.groups["ftp"] = ShareGrant::none;
    EXPECT_EQ(privilegeOf("anna"), denied) << "a refusal counts first among the groups";
}

TEST_F(SharePrivilegeTest, TheUsersOwnEntryDecidesBeforeTheGroups) {
    own(0777, 0, 0);
    share_.groups["staff"] = ShareGrant::none;
    share_.users["anna"] = ShareGrant::read;
    EXPECT_EQ(privilegeOf("anna"), readOnly);
    share_.groups["staff"] = ShareGrant::write;
    share_.users["anna"] = ShareGrant::none;
    EXPECT_EQ(privilegeOf("anna"), denied);
}

TEST_F(SharePrivilegeTest, AGroupIsCheckedAsAStrangerInIt) {
    share_.groups["staff"] = ShareGrant::write;
    own(0770, 0, staffGid);
    EXPECT_EQ(privilegeOf("staff"), readWrite);
    own(0750, 0, staffGid);
    EXPECT_EQ(privilegeOf("staff"), readOnly);
    own(0700, annaUid, staffGid);
    EXPECT_EQ(privilegeOf("staff"), denied);
}

TEST_F(SharePrivilegeTest, AnswersInAProcessThatIgnoresTheEndOfItsChildren) {
    share_.users["ftp"] = ShareGrant::read;
    const auto before = std::signal(SIGCHLD, SIG_IGN);
    EXPECT_EQ(privilegeOf("ftp"), readOnly);
    std::signal(SIGCHLD, before);
}

TEST_F(SharePrivilegeTest, LeavesTheCallersIdentityAloneAndServesManyThreads) {
    own(0750, 0, staffGid);
    share_.users["ftp"] = ShareGrant::write;
    share_.users["anna"] = ShareGrant::write;
    std::atomic<int> wrong = 0;
    std::vector<std::thread> threads;
    for (int i = 0; i < 4; ++i) {
        threads.emplace_back([&, i] {
            for (int round = 0; round < 25; ++round) {
                if (privilegeOf(i % 2 == 0 ? "ftp" : "anna") != (i % 2 == 0 ? denied : readOnly)) {
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

TEST_F(SharePrivilegeTest, TheContractFillsTheThirdWord) {
    share_.users["ftp"] = ShareGrant::read;
    ASSERT_EQ(saveShares({share_}), 0);
    VELT_SHARE* share = nullptr;
    ASSERT_EQ(VELTShareGet("public", &share), 0);
    VELT_SHARE_PRIV privilege{{7, 7}, 7};
    EXPECT_EQ(VELTShareUGPrivGetLocal("ftp", share, &privilege), 0);
    EXPECT_EQ(privilege.effective, readOnly);
    EXPECT_LT(VELTShareUGPrivGetLocal(nullptr, share, &privilege), 0);
    EXPECT_LT(VELTShareUGPrivGetLocal("ftp", share, nullptr), 0);
    VELTShareFree(share);
}

TEST(FolderAccess, NeedsAGroup) {
    EXPECT_FALSE(folderAccess("/", 1, {}));
    EXPECT_FALSE(lastErrorSentence().empty());
}

} // namespace
} // namespace velt
