// Delivers each event to everybody who reads the stream of events.
#ifndef VELT_HOST_API_EVENT_HUB_H
#define VELT_HOST_API_EVENT_HUB_H

#include "host/http/message.h"

#include <json/value.h>

#include <cstddef>
#include <memory>
#include <mutex>
#include <string>
#include <vector>

namespace velt::host {

/// Thread-safe.
class EventHub {
public:
    /// The hub does not keep the reader alive.
    void add(const std::shared_ptr<EventReader>& reader);

    /// How many are reading.
    std::size_t readers();

    /// Sends {event: type, data: data} to all readers. Does not block.
    void publish(const std::string& type, const Json::Value& data);

private:
    void forgetThoseThatLeft();

    std::mutex mutex_;
    std::vector<std::weak_ptr<EventReader>> readers_;
};

} // namespace velt::host

#endif
