#include "standalone/health/judge_health.h"

#include "standalone/health/checks.h"

#include <algorithm>
#include <array>
#include <exception>
#include <iterator>
#include <set>
#include <string>

namespace velt {
namespace {

Finding failedCheck(const std::exception& error) {
    return {"check-failed", Severity::warning, "host", std::string("A check failed: ") + error.what() + ".",
            "veltctl doctor"};
}

/// What follows from something else that may be found.
bool isConsequence(const Finding& finding) {
    return finding.id == settingsNotInForce || finding.id == nextStartFails;
}

/// A service that does not run with what is stored, or could not, has a reason, which another finding may
/// tell better.
void dropExplained(Findings& all) {
    std::set<std::string> explained;
    for (const Finding& each : all) {
        if (!isConsequence(each) && each.severity != Severity::notice) {
            explained.insert(each.subject);
        }
    }
    std::erase_if(all, [&](const Finding& each) {
        return isConsequence(each) && (explained.contains(each.subject) ||
                                       (each.id == nextStartFails && explained.contains("settings")));
    });
}

} // namespace

Findings judgeHealth() {
    using Check = Findings (*)();
    static constexpr std::array checks{
        Check{changeFindings},
        Check{[] { return journalFindings(std::chrono::system_clock::now()); }},
        Check{[] { return activityFindings(std::chrono::system_clock::now()); }},
        Check{serviceFindings},
        Check{programFindings},
        Check{settingsFileFindings},
        Check{greetingFindings},
        Check{settingsInForceFindings},
        Check{[] { return certificateFindings(std::chrono::system_clock::now()); }},
        Check{fileFindings},
        Check{ruleShareFindings},
        Check{keyFindings},
        Check{anonymousFindings},
        Check{confinementFindings},
        Check{firewallFindings},
        Check{passiveRangeFindings},
        Check{externalAddressFindings},
        Check{replacedProgramFindings},
        Check{diskFindings},
        Check{readOnlyFindings},
        Check{[] { return clockFindings(std::chrono::system_clock::now()); }},
    };
    Findings all;
    for (const Check check : checks) {
        try {
            std::ranges::move(check(), std::back_inserter(all));
        } catch (const std::exception& error) {
            all.push_back(failedCheck(error)); // the others still tell what they find
        }
    }
    dropExplained(all);
    std::ranges::stable_sort(all, std::ranges::greater(), &Finding::severity);
    return all;
}

Findings judgeSettings() {
    Findings all;
    for (const auto check : {passiveRangeFindings, externalAddressFindings, ruleShareFindings}) {
        std::ranges::move(check(), std::back_inserter(all));
    }
    return all;
}

} // namespace velt
