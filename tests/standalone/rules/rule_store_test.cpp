#include "standalone/core/last_error.h"
#include "standalone/core/state_root.h"
#include "standalone/rules/rule_store.h"
#include "tests/standalone/support/temporary_folder.h"

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

class RuleStore : public testing::Test {
protected:
    void SetUp() override { setStateRoot(root_.path()); }
    void TearDown() override { setStateRoot("/"); }

    TemporaryFolder root_;
};

TEST_F(RuleStore, holdsNothingBeforeTheFirstStore) {
    const auto rules = loadRules();
    ASSERT_TRUE(rules);
    EXPECT_TRUE(rules->empty());
}

TEST_F(RuleStore, keepsRulesAndTheirOrder) {
    const std::vector<ChrootRule> rules = {
        {false, 7, "/b"}, {true, 9, "/a/c"}, {true, 9, "/home"}, {false, 7, "/b"}};
    ASSERT_EQ(saveRules(rules), 0) << lastErrorSentence();
    EXPECT_EQ(loadRules(), rules);
    EXPECT_EQ(root_.read("etc/velt/chroot_rules"),
              "velt-chroot-rules 1\ng:7:/b\nu:9:/a/c\nu:9:/home\ng:7:/b\n");
}

TEST_F(RuleStore, isMadeOnceAndThenLeftAlone) {
    ASSERT_EQ(makeRulesFile(), 0);
    EXPECT_EQ(root_.read("etc/velt/chroot_rules"), "velt-chroot-rules 1\n");
    ASSERT_EQ(saveRules({{true, 1, "/home"}}), 0);
    ASSERT_EQ(makeRulesFile(), 0);
    EXPECT_EQ(loadRules()->size(), 1U);
}

TEST_F(RuleStore, isNotMadeAnewWhereItsFileCannotBeReached) {
    ASSERT_EQ(saveRules({{true, 1, "/home"}}), 0);
    const auto file = root_.path() / "etc/velt/chroot_rules";
    std::filesystem::rename(file, root_.path() / "disk");
    std::filesystem::create_symlink(root_.path() / "disk", file);
    std::filesystem::rename(root_.path() / "disk", root_.path() / "away");
    EXPECT_LT(makeRulesFile(), 0);
    EXPECT_NE(lastErrorSentence().find("chroot_rules"), std::string::npos) << lastErrorSentence();
    std::filesystem::rename(root_.path() / "away", root_.path() / "disk");
    EXPECT_EQ(loadRules()->size(), 1U);
}

TEST_F(RuleStore, namesTheLineThatIsDamaged) {
    const std::pair<const char*, const char*> cases[] = {
        {"", "Line 1 of "},
        {"velt-chroot-rules 2\n", "Line 1 of "},
        {"velt-chroot-rules 1", "Line 1 of "},
        {"velt-chroot-rules 1\nu:1:/home\nnonsense\n", "Line 3 of "},
        {"velt-chroot-rules 1\nu:1:/home", "Line 2 of "},
        {"velt-chroot-rules 1\n\n", "Line 2 of "},
    };
    for (const auto& [text, sentence] : cases) {
        root_.write("etc/velt/chroot_rules", text);
        EXPECT_FALSE(loadRules()) << text;
        EXPECT_EQ(lastErrorSentence().find(sentence), 0U) << lastErrorSentence();
        EXPECT_NE(lastErrorSentence().find("chroot_rules"), std::string::npos);
    }
}

} // namespace
} // namespace velt::test
