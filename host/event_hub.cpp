#include "host/event_hub.h"

#include "host/json_text.h"

namespace velt::host {

void EventHub::add(const std::shared_ptr<EventReader>& reader) {
    const std::lock_guard lock(mutex_);
    readers_.push_back(reader);
}

void EventHub::publish(const std::string& type, const Json::Value& data) {
    // JSON of one line holds no line end, so one data line is enough.
    const auto event =
        std::make_shared<const std::string>("event: " + type + "\ndata: " + toJson(data) + "\n\n");
    const std::lock_guard lock(mutex_);
    std::erase_if(readers_, [&event](const std::weak_ptr<EventReader>& each) {
        const auto reader = each.lock();
        if (reader != nullptr) {
            reader->deliver(event);
        }
        return reader == nullptr;
    });
}

} // namespace velt::host
