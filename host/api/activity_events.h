// What users do, as events.
#ifndef VELT_HOST_API_ACTIVITY_EVENTS_H
#define VELT_HOST_API_ACTIVITY_EVENTS_H

#include "host/api/events.h"
#include "standalone/standalone.h"

namespace velt::host {

/// Publishes it for its lifetime: "session", "transfer" and "operation".
class ActivityEvents {
public:
    /// The hub outlives it.
    explicit ActivityEvents(EventHub& hub);
    ~ActivityEvents();
    ActivityEvents(const ActivityEvents&) = delete;
    ActivityEvents& operator=(const ActivityEvents&) = delete;

private:
    ActivitySubscription subscription_;
};

} // namespace velt::host

#endif
