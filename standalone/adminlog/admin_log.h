// The administrator log: who changed what, when, and from where.
//
// A SQLite database, "/var/lib/velt/log.db" below the state root, that several processes write at once. VELTLogSet1
// appends to it, on behalf of the thread's request actor.
#ifndef VELT_STANDALONE_ADMINLOG_ADMIN_LOG_H
#define VELT_STANDALONE_ADMINLOG_ADMIN_LOG_H

#include "standalone/adminlog/log_entry.h"

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

namespace velt {

/// Which entries are wanted; what is not set does not narrow.
struct LogFilter {
    std::optional<LogTime> since; ///< this moment or later
    std::optional<std::uint32_t> event;
    std::optional<std::string> actor; ///< exactly this text
    std::optional<std::int64_t>
        beforeId;    ///< older than this entry: the last id of one page leads to the next
    int limit = 100; ///< 1 to 1000
};

/// The newest entries that the filter lets through, newest first; none before the first entry. Nothing, with the last
/// error set, when the log cannot be read. Thread-safe.
std::optional<std::vector<LogEntry>> queryLog(const LogFilter& filter);

} // namespace velt

#endif
