#include "standalone/core/state_root.h"
#include "standalone/rules/rule_store.h"
#include "tests/support/result.h"
#include "tests/support/temporary_folder.h"

#include <gtest/gtest.h>

#include <sys/stat.h>

namespace velt::test {
namespace {

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
    ASSERT_EQ(messageOf(storeRules(rules)), "");
    EXPECT_EQ(loadRules(), rules);
    struct stat file {};
    ASSERT_EQ(stat((root_.path() / "etc/velt/chroot_rules").c_str(), &file), 0);
    EXPECT_EQ(file.st_mode & 07777, 0600U) << "who is confined is nobody else's business";
    EXPECT_EQ(root_.read("etc/velt/chroot_rules"),
              "velt-chroot-rules 1\ng:7:/b\nu:9:/a/c\nu:9:/home\ng:7:/b\n");
}

TEST_F(RuleStore, isMadeOnceAndThenLeftAlone) {
    ASSERT_EQ(messageOf(makeRulesFile()), "");
    EXPECT_EQ(root_.read("etc/velt/chroot_rules"), "velt-chroot-rules 1\n");
    ASSERT_EQ(messageOf(storeRules({{true, 1, "/home"}})), "");
    ASSERT_EQ(messageOf(makeRulesFile()), "");
    EXPECT_EQ(loadRules()->size(), 1U);
}

TEST_F(RuleStore, missesAFileThatWasLost) {
    ASSERT_EQ(messageOf(makeRulesFile()), "");
    ASSERT_EQ(messageOf(expectRules()), "");
    EXPECT_EQ(loadRules(), std::vector<ChrootRule>());
    const std::string file = (root_.path() / "etc/velt/chroot_rules").string();
    std::filesystem::remove(file);
    EXPECT_EQ(
        messageOf(loadRules()),
        "The file of the chroot rules, " + file +
            ", is missing. Put your copy back; 'veltctl doctor' has the command for going on without rules.");
}

TEST_F(RuleStore, isNotMadeAnewWhereItsFileCannotBeReached) {
    ASSERT_EQ(messageOf(storeRules({{true, 1, "/home"}})), "");
    const auto file = root_.path() / "etc/velt/chroot_rules";
    std::filesystem::rename(file, root_.path() / "disk");
    std::filesystem::create_symlink(root_.path() / "disk", file);
    std::filesystem::rename(root_.path() / "disk", root_.path() / "away");
    const std::string why = messageOf(makeRulesFile());
    EXPECT_NE(why.find("chroot_rules"), std::string::npos) << why;
    std::filesystem::rename(root_.path() / "away", root_.path() / "disk");
    EXPECT_EQ(loadRules()->size(), 1U);
}

TEST_F(RuleStore, namesTheLineThatIsDamaged) {
    const std::pair<const char*, const char*> cases[] = {
        {"", "line 1: expected \"velt-chroot-rules 1\"."},
        {"velt-chroot-rules 2\n", "line 1: expected \"velt-chroot-rules 1\"."},
        {"velt-chroot-rules 1", "line 1: the line is cut off."},
        {"velt-chroot-rules 1\nu:1:/home\nnonsense\n",
         "line 3: expected a rule like \"u:1000:/share/folder\" or \"g:100:/home\"."},
        {"velt-chroot-rules 1\nu:1:/home", "line 2: the line is cut off."},
        {"velt-chroot-rules 1\n\n",
         "line 2: expected a rule like \"u:1000:/share/folder\" or \"g:100:/home\"."},
    };
    for (const auto& [text, sentence] : cases) {
        root_.write("etc/velt/chroot_rules", text);
        const std::string why = messageOf(loadRules());
        EXPECT_EQ(why, "Cannot read " + (root_.path() / "etc/velt/chroot_rules").string() + ", " + sentence)
            << text;
    }
}

} // namespace
} // namespace velt::test
