#include "standalone/accounts/name_service.h"

#include "standalone/accounts/account_sources.h"
#include "tests/support/temporary_folder.h"

#include <gtest/gtest.h>

#include <atomic>
#include <cstdlib>
#include <thread>

namespace velt {
namespace {

class NameServiceTest : public testing::Test {
protected:
    NameServiceTest() {
        folder_.write("passwd", "local1:x:1000:1000:Local:/home/local1:/bin/sh\n");
        folder_.write("group", "local1:x:1000:\n");
        folder_.write("login.defs", "");
    }
    ~NameServiceTest() override { setAccountSources({}); }

    void useServices(std::string_view nsswitch, const std::filesystem::path& modules,
                     std::chrono::seconds lifetime = std::chrono::seconds(30)) {
        folder_.write("nsswitch.conf", nsswitch);
        setAccountSources({folder_.path() / "passwd", folder_.path() / "group", folder_.path() / "login.defs",
                           folder_.path() / "nsswitch.conf", modules, lifetime});
    }

    std::vector<std::string> listing() {
        std::vector<std::string> lines;
        for (const UserEntry& user : *allUsers()) {
            lines.push_back(user.name + " " + std::to_string(user.source));
        }
        return lines;
    }

    test::TemporaryFolder folder_;
};

using Lines = std::vector<std::string>;

TEST_F(NameServiceTest, TellsTheSourcesApartAndCountsANameOnce) {
    useServices("passwd: files winbind sss\n", FAKE_MODULE_FOLDER);
    EXPECT_EQ(listing(),
              (Lines{"local1 1", "OFFICE\\anna 2", "LAB\\anna 2", "shared 2", "berta@example.org 8"}));
    EXPECT_EQ(userByName("local1")->source, sourceLocal);
    EXPECT_EQ(userByName("berta@example.org")->source, sourceLdap);
    EXPECT_EQ(userByName("OFFICE\\anna")->description, "Anna of the office");
}

TEST_F(NameServiceTest, FindsAnAccountThatItsSourceDoesNotList) {
    useServices("passwd: files winbind\n", FAKE_MODULE_FOLDER);
    ASSERT_TRUE(userByName("quiet"));
    EXPECT_EQ(userByName("quiet")->uid, 2'000'009U);
    ASSERT_TRUE(userById(2'000'009));
    EXPECT_EQ(userById(2'000'009)->name, "quiet");
    EXPECT_FALSE(userByName("nobody at all"));
}

TEST_F(NameServiceTest, FindsGroupsAndMemberships) {
    useServices("passwd: files winbind sss\n", FAKE_MODULE_FOLDER);
    ASSERT_TRUE(groupByName("winbind-people"));
    EXPECT_EQ(groupByName("winbind-people")->source, sourceDomain);
    EXPECT_EQ(groupById(4'000'002)->name, "sss-people");
    EXPECT_EQ(groupsOf(*userByName("OFFICE\\anna")), (std::vector<gid_t>{4'000'000, 4'000'001, 4'000'002}));
}

TEST_F(NameServiceTest, AGroupIsFoundWithoutAListingOfAllUsers) {
    using namespace std::chrono_literals;
    useServices("passwd: files winbind\n", FAKE_MODULE_FOLDER);
    ASSERT_EQ(setenv("FAKE_NSS_DELAY_MS", "3000", 1), 0);
    const auto begin = std::chrono::steady_clock::now();
    EXPECT_TRUE(groupByName("winbind-people"));
    EXPECT_TRUE(groupById(4'000'001));
    EXPECT_LT(std::chrono::steady_clock::now() - begin, 2s);
    unsetenv("FAKE_NSS_DELAY_MS");
}

TEST_F(NameServiceTest, ASlowDomainHoldsUpNobodyWhoKnowsItsFormerAnswer) {
    using namespace std::chrono_literals;
    useServices("passwd: files winbind\n", FAKE_MODULE_FOLDER, 0s);
    const Lines known = listing();
    ASSERT_EQ(known.size(), 4U);
    ASSERT_EQ(setenv("FAKE_NSS_DELAY_MS", "3000", 1), 0);
    std::atomic<bool> answered = false;
    std::thread asking([&] {
        listing();
        answered = true;
    });
    std::this_thread::sleep_for(500ms);
    EXPECT_EQ(listing(), known);
    EXPECT_EQ(groupById(1000)->name, "local1");
    EXPECT_FALSE(answered) << "the domain was asked meanwhile";
    asking.join();
    unsetenv("FAKE_NSS_DELAY_MS");
}

TEST_F(NameServiceTest, AModuleThatIsNotInUseIsNotAsked) {
    useServices("passwd: files\ngroup: files winbind sss\n", FAKE_MODULE_FOLDER);
    EXPECT_EQ(listing(), Lines{"local1 1"});
    EXPECT_FALSE(userByName("quiet"));
}

TEST_F(NameServiceTest, AMissingModuleIsASourceWithoutAccounts) {
    useServices("passwd: files winbind sss\n", folder_.path());
    EXPECT_EQ(listing(), Lines{"local1 1"});
    EXPECT_FALSE(userByName("OFFICE\\anna"));
}

TEST_F(NameServiceTest, AFileThatIsNoModuleIsASourceWithoutAccounts) {
    folder_.write("libnss_winbind.so.2", "not a shared object");
    useServices("passwd: files winbind\n", folder_.path());
    EXPECT_EQ(listing(), Lines{"local1 1"});
}

TEST(Nsswitch, FindsAServiceAsAWholeWordOfItsDatabase) {
    EXPECT_TRUE(nsswitchNames("passwd:\tfiles\twinbind # sss\n", "passwd", "winbind"));
    EXPECT_TRUE(nsswitchNames("# x\n  passwd : sss", "passwd", "sss"));
    EXPECT_FALSE(nsswitchNames("passwd: files winbind # sss\n", "passwd", "sss"));
    EXPECT_FALSE(nsswitchNames("passwd: sssd\n", "passwd", "sss"));
    EXPECT_FALSE(nsswitchNames("#passwd: sss\ngroup: sss\n", "passwd", "sss"));
    EXPECT_FALSE(nsswitchNames("", "passwd", "sss"));
}

} // namespace
} // namespace velt
