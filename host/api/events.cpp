#include "host/api/events.h"

#include "base/json_value.h"
#include "host/api/log_page.h"

namespace velt::host {

namespace {

std::string valueOf(const SystemEvent& event, const char* key) {
    const auto found = event.parameters.find(key);
    return found == event.parameters.end() ? "" : found->second;
}

void publish(EventHub& hub, const SystemEvent& event) {
    if (event.name == "velt.service.action") {
        hub.publish("service", jsonObject({{"service", valueOf(event, "SERVICE_NAME")},
                                           {"action", valueOf(event, "SERVICE_ACTION")}}));
    }
}

} // namespace

PlatformEvents::PlatformEvents(EventHub& hub)
    : events_(subscribeEvents([&hub](const SystemEvent& event) { publish(hub, event); })),
      log_(subscribeLog([&hub](const LogEntry& entry) { hub.publish("log", toObject(entry)); })) {}

PlatformEvents::~PlatformEvents() {
    unsubscribe(events_);
    unsubscribe(log_);
}

Route eventRoute() {
    return {"GET", {"events"}, false, RequestOrder::Kind::unordered, {}};
}

} // namespace velt::host
