// System events and log entries on their way to the subscribers in this process.
#ifndef VELT_STANDALONE_JOURNAL_EVENT_BUS_H
#define VELT_STANDALONE_JOURNAL_EVENT_BUS_H

#include "standalone/journal/log_entry.h"
#include "standalone/journal/system_event.h"

namespace velt {

/// Calls the subscribers, each for itself one call at a time. What they throw is dropped. Thread-safe.
void publish(const SystemEvent& event);
void publish(const LogEntry& entry);

} // namespace velt

#endif
