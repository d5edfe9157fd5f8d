#include "standalone/health/checks.h"
#include "standalone/rules/rule_store.h"
#include "standalone/shares/share_store.h"

#include <algorithm>
#include <set>

namespace velt {
namespace {

/// "music" of "/music/new"; "" of the path that means homes.
std::string shareOf(const ChrootRule& rule) {
    if (rule.path == homePath) {
        return "";
    }
    const auto end = rule.path.find('/', 1);
    return rule.path.substr(1, end == std::string::npos ? end : end - 1);
}

} // namespace

Findings ruleShareFindings() {
    const auto rules = loadRules();
    const auto shares = loadShares();
    if (!rules || !shares) { // other checks tell why
        return {};
    }
    std::set<std::string> missing;
    for (const ChrootRule& rule : *rules) {
        const std::string share = shareOf(rule);
        if (!share.empty() && std::ranges::find(*shares, share, &ShareEntry::name) == shares->end()) {
            missing.insert(share);
        }
    }
    Findings findings;
    for (const std::string& share : missing) {
        findings.push_back(
            {"rules-unknown-share", Severity::warning, "chroot",
             "There is no share \"" + share +
                 "\", which a chroot rule names: whom it is for cannot log in over FTP.",
             "Make the share, or remove the rule: veltctl chroot rules remove user|group NAME"});
    }
    return findings;
}

} // namespace velt
