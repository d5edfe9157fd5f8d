// The file of the chroot rules.
#include "fuzz/target.h"
#include "standalone/rules/rule_store.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    const auto rules = velt::parseRules(velt::fuzz::textOf(data, size));
    velt::fuzz::check(rules || !rules.error().message.empty(), "a refusal has a reason");
    if (rules) {
        for (const velt::ChrootRule& rule : *rules) {
            const auto again = velt::parseRule(velt::formatRule(rule));
            velt::fuzz::check(again && *again == rule, "a rule that is read can be written and read again");
            velt::fuzz::check(velt::isRulePath(rule.path), "a rule leads to a folder of a share or home");
        }
    }
    return 0;
}
