#include "standalone/rules/unnamed_rules.h"

#include "standalone/accounts/user_directory.h"
#include "standalone/core/state_lock.h"
#include "standalone/rules/rule_store.h"

#include <algorithm>

namespace velt {

Result<RulesByName> countRulesByName() {
    VELT_ASSIGN_OR_RETURN(const auto rules, loadRules());
    RulesByName found;
    for (std::size_t place = 0; place < rules.size(); ++place) {
        if (ownerOf(rules[place])) {
            ++found.named;
        } else {
            found.unnamed.push_back({place, rules[place]});
        }
    }
    return found;
}

Result<> putUnnamedRules(const std::vector<UnnamedRule>& rules) {
    if (rules.empty()) {
        return {};
    }
    VELT_ASSIGN_OR_RETURN(const auto lock, StateLock::take());
    VELT_ASSIGN_OR_RETURN(auto stored, loadRules());
    for (const UnnamedRule& each : rules) {
        const auto place = static_cast<std::ptrdiff_t>(std::min(each.place, stored.size()));
        stored.insert(stored.begin() + place, each.rule);
    }
    return storeRules(stored);
}

std::optional<std::string> ruleOwnerName(bool isUser, unsigned id) {
    auto name = ownerOf({isUser, id, ""});
    return name ? std::optional(std::move(*name)) : std::nullopt;
}

bool isRuleOwner(bool isUser, const std::string& name) {
    return isUser ? userByName(name).has_value() : groupByName(name).has_value();
}

} // namespace velt
