// /events: what happens, as it happens.
#ifndef VELT_HOST_API_EVENTS_H
#define VELT_HOST_API_EVENTS_H

#include "host/api/event_hub.h"
#include "host/api/route.h"
#include "standalone/standalone.h"

namespace velt::host {

/// Publishes what the platform announces, for its lifetime.
class PlatformEvents {
public:
    /// The hub outlives it.
    explicit PlatformEvents(EventHub& hub);
    ~PlatformEvents();
    PlatformEvents(const PlatformEvents&) = delete;
    PlatformEvents& operator=(const PlatformEvents&) = delete;

private:
    Subscription events_;
    Subscription log_;
};

Route eventRoute();

} // namespace velt::host

#endif
