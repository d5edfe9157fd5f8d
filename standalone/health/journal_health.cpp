#include "standalone/core/paths.h"
#include "standalone/core/state_root.h"
#include "standalone/health/checks.h"
#include "standalone/journal/admin_log.h"
#include "standalone/journal/change_history.h"

namespace velt {
namespace {

/// A change that is due is taken back at once, which may take some seconds.
constexpr std::chrono::seconds grace{5};
constexpr int mostWaiting = 1000;

Finding unusableLog(const Error& error) {
    const std::filesystem::path log = statePath(paths::logDatabase);
    const std::string aside = (log.parent_path() / "damaged-log").string();
    return {
        "log-unusable", Severity::warning, "log",
        error.message + " Changes are done, but nobody can tell later who made them, nor undo them.",
        "See that the disk can be written. If the file is damaged, put it aside for a new one, run: mkdir " +
            aside + " && mv " + log.string() + "* " + aside};
}

Result<> checkLog() {
    LogFilter newest;
    newest.limit = 1;
    VELT_ASSIGN_OR_RETURN(const auto entries, queryLog(newest));
    (void)entries;
    return checkHistoryCanBeWritten();
}

Finding overdue(const ChangeRecord& change) {
    const std::string id = std::to_string(change.id);
    return {
        "change-unconfirmed", Severity::error, "settings",
        "The change " + id +
            " was not confirmed in time, but could not be taken back: it is still in force. veltd's log has "
            "the reason, and it is tried again every half minute.",
        "veltctl undo " + id};
}

} // namespace

Findings journalFindings(TimePoint now) {
    if (const auto usable = checkLog(); !usable) {
        return {unusableLog(usable.error())};
    }
    ChangeFilter filter;
    filter.state = ChangeState::waiting;
    filter.limit = mostWaiting;
    const auto waiting = queryChanges(filter);
    if (!waiting) {
        return {unusableLog(waiting.error())};
    }
    Findings findings;
    for (const ChangeRecord& change : *waiting) {
        if (change.confirmBy && *change.confirmBy + grace < now) {
            findings.push_back(overdue(change));
        }
    }
    return findings;
}

} // namespace velt
