#include "standalone/activity/activity_reader.h"
#include "standalone/activity/operation_search.h"
#include "standalone/core/paths.h"
#include "standalone/core/state_root.h"
#include "standalone/health/checks.h"

#include <algorithm>
#include <string>
#include <vector>

namespace velt {
namespace {

/// Whoever looks at a server looks once a day.
constexpr std::chrono::hours remembered{24};

Finding lost(std::uint64_t count) {
    return {"records-lost", Severity::warning, "sessions",
            std::to_string(count) + (count == 1 ? " record" : " records") +
                " of what sessions did could not be written, the last one within this day. Nobody can look "
                "up what they said.",
            "See that there is room on the disk of " + statePath(paths::spools).string() + ", run: df -h " +
                statePath(paths::spools).parent_path().string()};
}

Finding stuck(const std::string& problem) {
    const std::filesystem::path store = statePath(paths::operationDatabase);
    const std::string aside = (store.parent_path() / "damaged-transfers").string();
    return {
        "records-stuck", Severity::warning, "sessions",
        problem + " What sessions do is still written down, but cannot be looked up.",
        "See that the disk can be written. If the file is damaged, put it aside for a new one, run: mkdir " +
            aside + " && mv " + store.string() + "* " + aside};
}

Finding notLogged(const std::string& problem) {
    return {"xferlog-stuck", Severity::warning, "sessions",
            problem + " Programs that read this log do not learn what sessions do; veltctl transfers has it.",
            "See that the file can be written, run: ls -ld " + statePath(paths::transferLog).string()};
}

std::string namesOf(const std::vector<std::string>& losers) {
    constexpr std::size_t mostNamed = 3;
    std::string names;
    for (std::size_t i = 0; i < std::min(losers.size(), mostNamed); ++i) {
        names += (i == 0 ? "" : ", ") + (losers[i].empty() ? "refused logins" : "user " + losers[i]);
    }
    const std::size_t others = losers.size() - std::min(losers.size(), mostNamed);
    return names + (others > 0 ? " and " + std::to_string(others) + " more" : "");
}

Finding early(const std::vector<std::string>& losers) {
    return {
        "records-early", Severity::warning, "sessions",
        "Within this day, records of what sessions did were removed before their age, since they take more "
        "room than max_size_mb in " +
            statePath(paths::activitySettings).string() + " allows: " + namesOf(losers) + ".",
        "Raise max_size_mb or lower max_age_days there. To see what fills the room, run: veltctl transfers"};
}

} // namespace

Findings activityFindings(TimePoint now) {
    Findings findings;
    if (const auto last = lastLostRecord(); last && now - *last < remembered) {
        findings.push_back(lost(lostRecords()));
    }
    if (const auto losers = losersOfRecords(now - remembered); losers && !losers->empty()) {
        findings.push_back(early(*losers));
    }
    if (const std::string problem = activityProblem(); !problem.empty()) {
        findings.push_back(stuck(problem));
    }
    if (const std::string problem = transferLogProblem(); !problem.empty()) {
        findings.push_back(notLogged(problem));
    }
    return findings;
}

} // namespace velt
