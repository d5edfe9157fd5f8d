#include "standalone/health/checks.h"
#include "standalone/health/mends.h"
#include "standalone/health/named_accounts.h"
#include "standalone/rules/rule_store.h"
#include "standalone/shares/share_store.h"

#include <algorithm>
#include <map>
#include <string>
#include <vector>

namespace velt {
namespace {

constexpr std::chrono::seconds accountLimit{2};

/// "music" of "/music/new"; "" of the path that means homes.
std::string shareOf(const ChrootRule& rule) {
    if (rule.path == homePath) {
        return "";
    }
    const auto end = rule.path.find('/', 1);
    return rule.path.substr(1, end == std::string::npos ? end : end - 1);
}

/// One command that removes the rules for all of them.
std::string removal(const std::vector<NamedAccount>& accounts) {
    std::string command;
    for (const NamedAccount& each : accounts) {
        const std::string name = each.name.empty() ? "#" + std::to_string(each.id) : each.name;
        command += std::string(command.empty() ? "" : " && ") + "veltctl chroot rules remove " +
                   (each.isUser ? "user " : "group ") + shellWord(name);
    }
    return command;
}

Finding missingShare(const std::string& share, const std::vector<NamedAccount>& accounts) {
    return {"rules-unknown-share", Severity::warning, "chroot",
            "There is no share \"" + share +
                "\", which a chroot rule names: whom it is for cannot log in over FTP.",
            "Make the share, or, to remove the rule, run: " + removal(withNames(accounts, accountLimit))};
}

} // namespace

Findings ruleShareFindings() {
    const auto rules = loadRules();
    const auto shares = loadShares();
    if (!rules || !shares) { // other checks tell why
        return {};
    }
    std::map<std::string, std::vector<NamedAccount>> missing;
    for (const ChrootRule& rule : *rules) {
        const std::string share = shareOf(rule);
        if (!share.empty() && std::ranges::find(*shares, share, &ShareEntry::name) == shares->end()) {
            missing[share].push_back({rule.isUser, "", rule.id});
        }
    }
    Findings findings;
    for (const auto& [share, accounts] : missing) {
        findings.push_back(missingShare(share, accounts));
    }
    return findings;
}

} // namespace velt
