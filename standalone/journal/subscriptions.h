// Hearing of events and log entries as they happen, within this process.
#ifndef VELT_STANDALONE_JOURNAL_SUBSCRIPTIONS_H
#define VELT_STANDALONE_JOURNAL_SUBSCRIPTIONS_H

#include "standalone/journal/log_entry.h"
#include "standalone/journal/system_event.h"

#include <cstdint>
#include <functional>

namespace velt {

using EventSubscriber = std::function<void(const SystemEvent&)>;
using LogSubscriber = std::function<void(const LogEntry&)>;
using Subscription = std::uint64_t; ///< never 0

/// Calls the subscriber with every event (log entry) from now on, on the thread that raised it, after it has
/// been written down. What the subscriber takes is added to the request's time, so it hands the event on and
/// returns. It may be called by several threads at once; what it throws is dropped.
Subscription subscribeEvents(EventSubscriber subscriber);
Subscription subscribeLog(LogSubscriber subscriber);

/// Ends a subscription of either kind. When it returns, the subscriber is not running and is not called
/// again; a subscriber must not end its own subscription. An unknown one is ignored.
void unsubscribe(Subscription subscription);

} // namespace velt

#endif
