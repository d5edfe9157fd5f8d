#include "host/api/events.h"

#include "base/json_value.h"
#include "host/api/log_page.h"
#include "host/base/json.h"

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
    } else if (event.name == "velt.login.ban") {
        hub.publish("ban", jsonObject({{"action", valueOf(event, "ACTION")},
                                       {"address", valueOf(event, "ADDRESS")},
                                       {"service", valueOf(event, "SERVICE")},
                                       {"until", valueOf(event, "UNTIL")}}));
    }
}

} // namespace

void EventHub::add(const std::shared_ptr<EventReader>& reader, const std::string& tokenId) {
    const std::lock_guard lock(mutex_);
    // Readers may come and go for a long time without an event.
    forgetThoseThatLeft();
    readers_.push_back({reader, tokenId});
}

void EventHub::endThoseOf(const std::string& tokenId) {
    const std::lock_guard lock(mutex_);
    for (const Entry& each : readers_) {
        const auto reader = each.tokenId == tokenId ? each.reader.lock() : nullptr;
        if (reader) {
            reader->end();
        }
    }
}

std::size_t EventHub::readers() {
    const std::lock_guard lock(mutex_);
    forgetThoseThatLeft();
    return readers_.size();
}

void EventHub::forgetThoseThatLeft() {
    std::erase_if(readers_, [](const Entry& each) { return each.reader.expired(); });
}

void EventHub::publish(const std::string& type, const Json::Value& data) {
    // The JSON has no line breaks, so one data line is enough.
    const auto event =
        std::make_shared<const std::string>("event: " + type + "\ndata: " + toJson(data) + "\n\n");
    const std::lock_guard lock(mutex_);
    for (const Entry& each : readers_) {
        if (const auto reader = each.reader.lock()) {
            reader->deliver(event);
        }
    }
}

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
