#include "standalone/accounts/account_files.h"

#include <gtest/gtest.h>

namespace velt {
namespace {

TEST(ParsePasswd, ReadsTheFieldsOfAUser) {
    const auto users = parsePasswd("anna:x:1000:1001:Anna Example,room 1,,:/home/anna:/bin/sh\n");
    ASSERT_EQ(users.size(), 1U);
    EXPECT_EQ(users[0].name, "anna");
    EXPECT_EQ(users[0].uid, 1000U);
    EXPECT_EQ(users[0].gid, 1001U);
    EXPECT_EQ(users[0].home, "/home/anna");
    EXPECT_EQ(users[0].description, "Anna Example");
    EXPECT_EQ(users[0].source, sourceLocal);
}

TEST(ParsePasswd, ReadsALastLineWithoutALineEnd) {
    EXPECT_EQ(parsePasswd("a:x:1:1:::\nb:x:2:2:::").size(), 2U);
}

TEST(ParsePasswd, SkipsWhatIsNoUser) {
    const char* const lines[] = {"",
                                 "# a:x:1:1:::",
                                 "#a:x:1:1:::",
                                 "+::::::",
                                 "+a:x:1:1:::",
                                 "-@old:x:1:1:::",
                                 "a:x:one:1:::",
                                 "a:x:-1:1:::",
                                 "a:x:1:1",
                                 "a:x::1:::",
                                 ":x:1:1:::",
                                 "a:x:99999999999:1:::",
                                 "a:x:1:1::::extra"};
    for (const char* line : lines) {
        EXPECT_TRUE(parsePasswd(std::string(line) + "\n").empty()) << line;
    }
}

TEST(ParsePasswd, KeepsBytesThatAreNoUtf8) {
    const auto users = parsePasswd("a:x:1:1:\xff\xfe:/home/\xff:\n");
    ASSERT_EQ(users.size(), 1U);
    EXPECT_EQ(users[0].description, "\xff\xfe");
}

TEST(Description, EndsAtTheFirstComma) {
    EXPECT_EQ(descriptionOf("Anna"), "Anna");
    EXPECT_EQ(descriptionOf("Anna,room"), "Anna");
    EXPECT_EQ(descriptionOf(",room"), "");
    EXPECT_EQ(descriptionOf(""), "");
}

TEST(ParseGroup, ReadsNumberAndMembers) {
    const auto groups = parseGroup("staff:x:50:anna, berta ,,carl\nempty:x:51:\nbad:x:y:\n");
    ASSERT_EQ(groups.size(), 2U);
    EXPECT_EQ(groups[0].entry.name, "staff");
    EXPECT_EQ(groups[0].entry.gid, 50U);
    EXPECT_EQ(groups[0].members, (std::vector<std::string>{"anna", "berta", "carl"}));
    EXPECT_TRUE(groups[1].members.empty());
}

TEST(ParseLoginDefs, ReadsTheRangeAndIgnoresTheRest) {
    const UidRange range =
        parseLoginDefs("# UID_MIN 5\n  UID_MIN\t 500 \nUID_MAX 700\nSYS_UID_MAX 99\nUID_MIN\n");
    EXPECT_EQ(range.first, 500U);
    EXPECT_EQ(range.last, 700U);
}

TEST(ParseLoginDefs, FallsBackToTheCustomaryRange) {
    const UidRange range = parseLoginDefs("UID_MIN many\nUID_MAX\n");
    EXPECT_EQ(range.first, 1000U);
    EXPECT_EQ(range.last, 60000U);
}

} // namespace
} // namespace velt
