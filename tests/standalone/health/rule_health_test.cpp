// What is found about chroot rules for shares.
#include "standalone/accounts/account_sources.h"
#include "standalone/rules/rule_store.h"
#include "tests/standalone/health/health_test.h"
#include "tests/standalone/support/state_folder.h"
#include "tests/support/result.h"

#include <gtest/gtest.h>

#include <string>

namespace velt::test {
namespace {

class RuleHealth : public testing::Test {
protected:
    void SetUp() override {
        AccountSources sources;
        sources.passwd = root_.write("passwd", "alice:x:1001:1001::/home/a:/bin/sh\n");
        sources.group = root_.write("group", "night shift:x:2001:alice\n");
        sources.nsswitch = root_.write("nsswitch", "passwd: files\ngroup: files\n");
        setAccountSources(sources);
    }

    void TearDown() override { setAccountSources({}); }

    StateFolder root_;
};

TEST_F(RuleHealth, ACommandForEachRuleRemovesThoseOfAMissingShare) {
    ASSERT_EQ(messageOf(storeRules({{true, 1001, "/gone/below"},
                                    {true, 4711, "/gone"},
                                    {true, 0, "/home"},
                                    {false, 2001, "/gone"}})),
              "");
    const Findings found = ruleShareFindings();
    ASSERT_EQ(summary(found), "warning rules-unknown-share");
    EXPECT_EQ(found.at(0).mend, "Make the share, or, to remove the rule, run: veltctl chroot rules remove "
                                "user alice && veltctl chroot rules remove user '#4711' && veltctl chroot "
                                "rules remove group 'night shift'");
}

} // namespace
} // namespace velt::test
