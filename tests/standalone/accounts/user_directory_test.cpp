#include "standalone/accounts/user_directory.h"

#include "standalone/accounts/account_sources.h"
#include "tests/support/temporary_folder.h"

#include <gtest/gtest.h>

#include <atomic>
#include <thread>

namespace velt {
namespace {

std::vector<std::string> namesOf(const std::vector<UserEntry>& users) {
    std::vector<std::string> names;
    for (const UserEntry& user : users) {
        names.push_back(user.name);
    }
    return names;
}

using Names = std::vector<std::string>;

class UserDirectoryTest : public testing::Test {
protected:
    UserDirectoryTest() {
        folder_.write("passwd", "root:x:0:0:root:/root:/bin/sh\n"
                                "ftp:x:110:115:ftp daemon,,,:/srv/ftp:/usr/sbin/nologin\n"
                                "zoe:x:1001:1001:Zoe,room 2:/home/zoe:/bin/sh\n"
                                "anna:x:1000:1000:Anna Example:/home/anna:/bin/sh\n"
                                "nobody:x:1002:65534:nobody:/:/usr/sbin/nologin\n"
                                "late:x:60001:60001::/home/late:/bin/sh\n");
        folder_.write("group", "root:x:0:\nstaff:x:50:zoe,anna\nmedia:x:51:anna\nanna:x:1000:anna\n");
        folder_.write("login.defs", "UID_MIN 1000\nUID_MAX 60000\n");
        AccountSources sources;
        sources.passwd = folder_.path() / "passwd";
        sources.group = folder_.path() / "group";
        sources.loginDefs = folder_.path() / "login.defs";
        sources.nsswitch = folder_.path() / "nsswitch.conf";
        setAccountSources(sources);
    }
    ~UserDirectoryTest() override { setAccountSources({}); }

    test::TemporaryFolder folder_;
};

TEST_F(UserDirectoryTest, ListsPeopleInTheOrderOfTheFile) {
    EXPECT_EQ(namesOf(*allUsers()), (Names{"zoe", "anna"}));
}

TEST_F(UserDirectoryTest, FindsSystemAccountsThoughTheyAreNotListed) {
    ASSERT_TRUE(userByName("ftp"));
    EXPECT_EQ(userByName("ftp")->uid, 110U);
    EXPECT_EQ(userByName("ftp")->description, "ftp daemon");
    ASSERT_TRUE(userById(0));
    EXPECT_EQ(userById(0)->name, "root");
    EXPECT_EQ(userById(1001)->name, "zoe");
    EXPECT_FALSE(userByName("unknown"));
    EXPECT_FALSE(userById(4711));
}

TEST_F(UserDirectoryTest, DoesNotTakeAPrefixOrOddTextForAName) {
    for (const std::string name : {"ann", "ANNA", "anna\n", "anna:x", "", "\xff", "../anna"}) {
        EXPECT_FALSE(userByName(name)) << name;
    }
    EXPECT_FALSE(userByName(std::string("anna\0", 5)));
}

TEST_F(UserDirectoryTest, FindsGroups) {
    ASSERT_TRUE(groupByName("staff"));
    EXPECT_EQ(groupByName("staff")->gid, 50U);
    EXPECT_EQ(groupById(51)->name, "media");
    EXPECT_FALSE(groupByName("nowhere"));
    EXPECT_FALSE(groupById(4711));
}

TEST_F(UserDirectoryTest, NamesAUsersGroupsThePrimaryOneFirstAndOnce) {
    EXPECT_EQ(groupsOf(*userByName("anna")), (std::vector<gid_t>{1000, 50, 51}));
    EXPECT_EQ(groupsOf(*userByName("zoe")), (std::vector<gid_t>{1001, 50}));
}

TEST_F(UserDirectoryTest, SeesAChangeOfTheFileAtOnceEvenOfTheSameSize) {
    EXPECT_TRUE(userByName("zoe"));
    for (int round = 0; round < 20; ++round) {
        const std::string name = round % 2 == 0 ? "eva" : "zoe";
        folder_.write("new", name + ":x:1001:1001:::\n");
        std::filesystem::rename(folder_.path() / "new", folder_.path() / "passwd");
        ASSERT_EQ(namesOf(*allUsers()), Names{name}) << round;
    }
}

TEST_F(UserDirectoryTest, SeesAChangeOfTheRange) {
    folder_.write("login.defs", "UID_MIN 1001\nUID_MAX 70000\n");
    EXPECT_EQ(namesOf(*allUsers()), (Names{"zoe", "late"}));
    folder_.write("login.defs", "UID_MIN 1000\nUID_MAX 1001\n");
    EXPECT_EQ(namesOf(*allUsers()), (Names{"zoe", "anna"})) << "both ends belong to it";
}

TEST_F(UserDirectoryTest, KeepsASnapshotThatIsInUseUnchanged) {
    const auto before = allUsers();
    folder_.write("passwd", "other:x:1000:1000:::\n");
    EXPECT_EQ(namesOf(*allUsers()), Names{"other"});
    EXPECT_EQ(namesOf(*before), (Names{"zoe", "anna"}));
}

TEST_F(UserDirectoryTest, SharesOneSnapshotWhileNothingChanges) {
    allUsers();
    std::this_thread::sleep_for(std::chrono::milliseconds(60));
    const auto first = allUsers();
    EXPECT_EQ(first.get(), allUsers().get());
}

TEST_F(UserDirectoryTest, AMissingFileMeansNoUsers) {
    std::filesystem::remove(folder_.path() / "passwd");
    EXPECT_TRUE(allUsers()->empty());
    EXPECT_FALSE(userByName("anna"));
}

TEST_F(UserDirectoryTest, AFileThatCannotBeReadForAMomentIsNoEmptyOne) {
    const auto make = [&](const char* passwd, const char* group) {
        for (const char* name : {"passwd", "group"}) {
            std::filesystem::remove(folder_.path() / name);
        }
        folder_.write("passwd", passwd);
        folder_.write("group", group);
    };
    const auto makeUnreadable = [&] {
        for (const char* name : {"passwd", "group"}) {
            std::filesystem::remove(folder_.path() / name);
            std::filesystem::create_directory(folder_.path() / name);
        }
    };
    makeUnreadable();
    EXPECT_FALSE(userByName("anna"));
    EXPECT_FALSE(groupByName("staff"));
    make("anna:x:1000:1000:Anna:/home/anna:/bin/sh\n", "staff:x:50:anna\n");
    EXPECT_TRUE(userByName("anna"));
    EXPECT_TRUE(groupByName("staff"));
    makeUnreadable();
    EXPECT_TRUE(userByName("anna")) << "as it was last read";
    EXPECT_TRUE(groupByName("staff"));
    make("max:x:1003:1003:Max:/home/max:/bin/sh\n", "crew:x:52:max\n");
    EXPECT_TRUE(userByName("max"));
    EXPECT_TRUE(groupByName("crew"));
    EXPECT_FALSE(groupByName("staff"));
}

TEST_F(UserDirectoryTest, OfTwoEntriesWithOneNameTheFirstCounts) {
    folder_.write("passwd", "anna:x:1000:1:first::\nanna:x:1001:1:second::\n");
    EXPECT_EQ(userByName("anna")->uid, 1000U);
}

TEST_F(UserDirectoryTest, ServesManyThreadsWhileTheFileChanges) {
    std::atomic<bool> done = false;
    std::atomic<int> wrong = 0;
    std::vector<std::thread> readers;
    for (int i = 0; i < 4; ++i) {
        readers.emplace_back([&] {
            while (!done) {
                const auto users = allUsers();
                if (users->size() != 1 && users->size() != 2) {
                    ++wrong;
                }
                userByName("anna");
            }
        });
    }
    for (int round = 0; round < 200; ++round) {
        folder_.write("new", round % 2 == 0 ? "a:x:1000:1:::\n" : "a:x:1000:1:::\nb:x:1001:1:::\n");
        std::filesystem::rename(folder_.path() / "new", folder_.path() / "passwd");
    }
    done = true;
    for (std::thread& reader : readers) {
        reader.join();
    }
    EXPECT_EQ(wrong, 0);
}

TEST(UserFilterTest, NarrowsBySource) {
    const UserEntry domain{"OFFICE\\anna", 1, 1, "", "", sourceDomain};
    EXPECT_TRUE(matches(domain, {sourceDomain, "", ""}));
    EXPECT_TRUE(matches(domain, {sourceLocal | sourceDomain | sourceLdap, "", ""}));
    EXPECT_FALSE(matches(domain, {sourceLocal | sourceLdap, "", ""}));
}

TEST(UserFilterTest, NarrowsBySubstringWithoutRegardToCase) {
    const UserEntry user{"Anna.Berg", 1, 1, "", "", sourceLocal};
    EXPECT_TRUE(matches(user, {sourceLocal, "na.b", ""}));
    EXPECT_TRUE(matches(user, {sourceLocal, "ANNA", ""}));
    EXPECT_FALSE(matches(user, {sourceLocal, "anna berg", ""}));
    EXPECT_FALSE(matches(user, {sourceLocal, "%", ""}));
}

TEST(UserFilterTest, NarrowsByDomainInBothForms) {
    const UserEntry windows{"OFFICE\\anna", 1, 1, "", "", sourceDomain};
    const UserEntry mail{"anna@example.org", 1, 1, "", "", sourceLdap};
    const UserEntry local{"office", 1, 1, "", "", sourceLocal};
    EXPECT_TRUE(matches(windows, {sourceDomain, "", "office"}));
    EXPECT_FALSE(matches(windows, {sourceDomain, "", "off"}));
    EXPECT_TRUE(matches(mail, {sourceLdap, "", "EXAMPLE.org"}));
    EXPECT_FALSE(matches(mail, {sourceLdap, "", "org"}));
    EXPECT_FALSE(matches(local, {sourceLocal, "", "office"}));
}

} // namespace
} // namespace velt
