// The chroot rules of accounts without names, over the fake platform.
#include "standalone/rules/unnamed_rules.h"
#include "tests/support/fake_platform/fake_platform.h"

#include <algorithm>

namespace {

/// The rule of a line as the fake platform stores them: "user:1000:/public".
velt::ChrootRule ruleIn(const std::string& line) {
    const auto first = line.find(':');
    const auto second = line.find(':', first + 1);
    const std::string number = line.substr(first + 1, second - first - 1);
    return {line.starts_with("user"), static_cast<unsigned>(std::stoul(number)), line.substr(second + 1)};
}

} // namespace

namespace velt {

Result<RulesByName> countRulesByName() {
    RulesByName found;
    std::size_t place = 0;
    for (const std::string& line : fake::Platform::instance().rules) {
        const ChrootRule rule = ruleIn(line);
        if (ruleOwnerName(rule.isUser, rule.id)) {
            ++found.named;
        } else {
            found.unnamed.push_back({place, rule});
        }
        ++place;
    }
    return found;
}

Result<> putUnnamedRules(const std::vector<UnnamedRule>& rules) {
    auto& stored = fake::Platform::instance().rules;
    for (const auto& [place, rule] : rules) {
        const auto at = static_cast<std::ptrdiff_t>(std::min(place, stored.size()));
        stored.insert(stored.begin() + at,
                      (rule.isUser ? "user:" : "group:") + std::to_string(rule.id) + ":" + rule.path);
    }
    return {};
}

std::optional<std::string> ruleOwnerName(bool isUser, unsigned id) {
    const auto& platform = fake::Platform::instance();
    for (const auto& [name, user] : platform.users) {
        if (isUser && static_cast<unsigned>(user.uid) == id) {
            return name;
        }
    }
    for (const auto& [name, gid] : platform.groups) {
        if (!isUser && static_cast<unsigned>(gid) == id) {
            return name;
        }
    }
    return std::nullopt;
}

bool isRuleOwner(bool isUser, const std::string& name) {
    const auto& platform = fake::Platform::instance();
    return isUser ? platform.users.contains(name) : platform.groups.contains(name);
}

} // namespace velt
