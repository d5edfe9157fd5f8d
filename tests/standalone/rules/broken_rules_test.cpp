#include "standalone/rules/rule_store.h"
#include "tests/standalone/support/text_breaker.h"

#include <gtest/gtest.h>

namespace velt::test {
namespace {

TEST(BrokenRules, areRefusedOrKeepTheirForm) {
    const std::string rules = "velt-chroot-rules 1\nu:1000:/home\ng:100:/a/below\nu:4294967294:/b\n";
    TextBreaker breaker;
    int refused = 0;
    for (int i = 0; i < 20000; i++) {
        const std::string text = breaker.broken(rules);
        const auto read = parseRules(text);
        if (!read) {
            refused++;
            continue;
        }
        std::string again = "velt-chroot-rules 1\n";
        for (const ChrootRule& rule : *read) {
            again += formatRule(rule) + "\n";
        }
        EXPECT_EQ(again, text);
    }
    EXPECT_GT(refused, 10000);
    EXPECT_LT(refused, 20000);
}

} // namespace
} // namespace velt::test
