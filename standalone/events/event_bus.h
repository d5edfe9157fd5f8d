// System events and log entries on their way to whoever listens in this process.
#ifndef VELT_STANDALONE_EVENTS_EVENT_BUS_H
#define VELT_STANDALONE_EVENTS_EVENT_BUS_H

#include "standalone/adminlog/log_entry.h"

#include <functional>
#include <map>
#include <string>

namespace velt {

struct SystemEvent {
    LogTime time;     ///< UTC
    std::string name; ///< "velt.service.action"
    std::map<std::string, std::string> parameters;
    std::string actor;   ///< as in the administrator log
    std::string address; ///< likewise
};

/// Calls `listener` for each event that is announced from now on, in the announcing thread, one call at a time. An
/// exception that leaves it is dropped. The result is for unsubscribe. Thread-safe.
int subscribeEvents(std::function<void(const SystemEvent&)> listener);

/// The same for entries of the administrator log, once they are stored.
int subscribeLog(std::function<void(const LogEntry&)> listener);

/// Ends a subscription of either kind; none is called after it returns. A listener may end its own. Unknown numbers are
/// ignored. Thread-safe.
void unsubscribe(int subscription);

/// Tells the subscribers.
void publish(const SystemEvent& event);
void publish(const LogEntry& entry);

} // namespace velt

#endif
