// The administrator log: who changed what, when, and from where. A database that several processes write at
// once.
#ifndef VELT_STANDALONE_JOURNAL_ADMIN_LOG_H
#define VELT_STANDALONE_JOURNAL_ADMIN_LOG_H

#include "base/result.h"
#include "standalone/journal/log_entry.h"

#include <array>
#include <vector>

namespace velt {

/// Writes down an event of the catalogue that happens now, on behalf of the calling thread's actor, and tells
/// the subscribers. Texts are made plain and cut; a null one counts as "". Thread-safe.
Result<> logEvent(int category, int level, unsigned event, const std::array<const char*, 4>& texts);

/// Writes down an entry that was made before, as it is but for its id, and tells the subscribers.
/// Thread-safe.
Result<> writeLogEntry(LogEntry entry);

/// The newest entries that the filter lets through, newest first. Thread-safe.
Result<std::vector<LogEntry>> queryLog(const LogFilter& filter);

} // namespace velt

#endif
