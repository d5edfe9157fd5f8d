#include "standalone/activity/activity_reader.h"
#include "standalone/core/paths.h"
#include "standalone/core/state_root.h"
#include "standalone/health/checks.h"

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

} // namespace

Findings activityFindings(TimePoint now) {
    Findings findings;
    if (const auto last = lastLostRecord(); last && now - *last < remembered) {
        findings.push_back(lost(lostRecords()));
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
