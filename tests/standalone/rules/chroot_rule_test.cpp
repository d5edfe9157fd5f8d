#include "standalone/rules/chroot_rule.h"

#include <gtest/gtest.h>

namespace velt::test {
namespace {

TEST(RulePath, namesAShareOrAFolderInOneOrTheHomes) {
    for (const char* path : {"/home", "/share", "/share/below", "/a b/c/d", "/\xff\xfe/\xc3\xa4", "/-x",
                             "/...", "/%u", "/a:b", "/#", "/\"q\"", "/%{env:PATH}"}) {
        EXPECT_TRUE(isRulePath(path)) << path;
    }
    for (const std::string& path :
         {std::string(), std::string("/"), std::string("share"), std::string("//"), std::string("/a//b"),
          std::string("/a/"), std::string("/.."), std::string("/a/../b"), std::string("/."),
          std::string("/a/./b"), std::string("/a\nu:0:/b"), std::string("/a\tb"), std::string("/a\x7f"),
          std::string("/a\0b", 4)}) {
        EXPECT_FALSE(isRulePath(path)) << testing::PrintToString(path);
    }
}

TEST(RuleLine, isReadBackAsItWasWritten) {
    for (const ChrootRule& rule : {ChrootRule{true, 1000, "/home"}, ChrootRule{false, 100, "/a b/c:d"},
                                   ChrootRule{true, 4294967294U, "/x"}, ChrootRule{false, 0, "/ä"}}) {
        EXPECT_EQ(parseRule(formatRule(rule)), rule);
    }
    EXPECT_EQ(formatRule({true, 1000, "/share/below"}), "u:1000:/share/below");
}

TEST(RuleLine, inAnotherFormIsNone) {
    for (const std::string& line :
         {std::string(), std::string("u:1000"), std::string("x:1000:/home"), std::string("u::/home"),
          std::string("u:-1:/home"), std::string("u:01:/home"), std::string("u:+1:/home"),
          std::string("u: 1:/home"), std::string("u:4294967296:/home"), std::string("u:1000:home"),
          std::string("u:1000:/a/../b"), std::string("u:1000:/home\n"), std::string("U:1000:/home"),
          "u:1000:/" + std::string(longestRule, 'a')}) {
        EXPECT_FALSE(parseRule(line)) << line.substr(0, 40);
    }
}

TEST(RuleOfALogin, isTheFirstOfTheUserElseTheFirstOfAGroup) {
    const std::vector<ChrootRule> rules = {{false, 20, "/first"},
                                           {true, 7, "/own"},
                                           {false, 10, "/second"},
                                           {true, 7, "/later"},
                                           {true, 20, "/20"}};
    const auto pathFor = [&](uid_t uid, const std::vector<gid_t>& gids) {
        const ChrootRule* const rule = ruleFor(rules, uid, gids);
        return rule != nullptr ? rule->path : "";
    };
    EXPECT_EQ(pathFor(7, {10, 20}), "/own");
    EXPECT_EQ(pathFor(8, {10, 20}), "/first") << "in the order of the rules";
    EXPECT_EQ(pathFor(8, {10}), "/second");
    EXPECT_EQ(pathFor(8, {7}), "") << "a user's number is not a group's";
    EXPECT_EQ(pathFor(10, {8}), "") << "nor the other way round";
}

} // namespace
} // namespace velt::test
