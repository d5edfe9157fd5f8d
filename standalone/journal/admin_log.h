// The administrator log: who changed what, when, and from where. A database that several processes write at
// once.
#ifndef VELT_STANDALONE_JOURNAL_ADMIN_LOG_H
#define VELT_STANDALONE_JOURNAL_ADMIN_LOG_H

#include "standalone/journal/log_entry.h"

#include <array>
#include <optional>
#include <vector>

namespace velt {

/// The entry for an event of the catalogue that happens now, on behalf of the calling thread's actor. Texts
/// are made plain and cut; a null one counts as "".
LogEntry makeLogEntry(int category, int level, unsigned event, const std::array<const char*, 4>& texts);

/// Writes the entry down and gives it its id. Negative on failure, with the last error set. Thread-safe.
int storeLogEntry(LogEntry& entry);

/// The newest entries that the filter lets through, newest first. Nothing, with the last error set, when the
/// log cannot be read.
std::optional<std::vector<LogEntry>> queryLog(const LogFilter& filter);

} // namespace velt

#endif
