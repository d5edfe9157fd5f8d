// Which changes of the settings were made, in the database of the administrator log.
#ifndef VELT_STANDALONE_JOURNAL_CHANGE_HISTORY_H
#define VELT_STANDALONE_JOURNAL_CHANGE_HISTORY_H

#include "base/result.h"

#include <chrono>
#include <cstdint>
#include <optional>
#include <string>
#include <vector>

namespace velt {

enum class ChangeState {
    done,
    waiting,   ///< done, and taken back unless somebody confirms it in time
    confirmed, ///< done, and was confirmed
    undone,
    superseded, ///< was not confirmed, and all that it changed was changed again since
    begun,      ///< may be done or not: written down first, so that a crash loses no change that is done
};

/// "done", "waiting", "confirmed", "undone", "superseded", "begun".
std::string changeStateName(ChangeState state);

/// An accepted change of the settings.
struct ChangeRecord {
    std::int64_t id = 0;                        ///< grows with each change; none is used twice
    std::chrono::system_clock::time_point time; ///< in whole milliseconds
    std::string actor;
    std::string address;
    std::string way;    ///< what was used: "settings", a method's name, "undo 12"
    std::string fields; ///< what changed, as its host wrote it
    ChangeState state = ChangeState::done;
    std::optional<std::chrono::system_clock::time_point>
        confirmBy; ///< of one that waits, or was not confirmed
};

struct ChangeFilter {
    std::optional<std::int64_t> beforeId; ///< older than this change
    std::optional<ChangeState> state;
    int limit = 100; ///< 1 to 1000
};

/// The newest changes that are kept; older ones are removed, as are those past the age of the administrator
/// log (log_retention.h).
inline constexpr int keptChanges = 10'000;

/// What the fields of the kept changes take together, in bytes; the newest change is kept whatever it takes.
inline constexpr std::int64_t keptBytes = std::int64_t{64} * 1024 * 1024;

/// Writes the change down, and returns its id. Thread-safe, as the others.
Result<std::int64_t> recordChange(const ChangeRecord& change);

/// Whether a change could be written down now, other than for a full disk.
Result<> checkHistoryCanBeWritten();

/// What became of the change. One that is confirmed has no deadline any more. No error when it is not kept
/// any more.
Result<> setChangeState(std::int64_t id, ChangeState state);

/// Gives the change other fields. No error when it is not kept any more.
Result<> setChangeFields(std::int64_t id, const std::string& fields);

/// Removes a change that was not done. No error when there is none.
Result<> removeChange(std::int64_t id);

/// Newest first.
Result<std::vector<ChangeRecord>> queryChanges(const ChangeFilter& filter);

/// Nothing when there is no such change.
Result<std::optional<ChangeRecord>> changeRecord(std::int64_t id);

} // namespace velt

#endif
