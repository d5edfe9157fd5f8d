#include "host/api/event_hub.h"

#include "host/base/json.h"

namespace velt::host {

void EventHub::add(const std::shared_ptr<EventReader>& reader) {
    const std::lock_guard lock(mutex_);
    // Readers may come and go for a long time without an event.
    forgetThoseThatLeft();
    readers_.push_back(reader);
}

std::size_t EventHub::readers() {
    const std::lock_guard lock(mutex_);
    forgetThoseThatLeft();
    return readers_.size();
}

void EventHub::forgetThoseThatLeft() {
    std::erase_if(readers_, [](const std::weak_ptr<EventReader>& each) { return each.expired(); });
}

void EventHub::publish(const std::string& type, const Json::Value& data) {
    // The JSON has no line breaks, so one data line is enough.
    const auto event =
        std::make_shared<const std::string>("event: " + type + "\ndata: " + toJson(data) + "\n\n");
    const std::lock_guard lock(mutex_);
    for (const std::weak_ptr<EventReader>& each : readers_) {
        if (const auto reader = each.lock()) {
            reader->deliver(event);
        }
    }
}

} // namespace velt::host
