// /events: what happens, as it happens.
#ifndef VELT_HOST_API_EVENTS_H
#define VELT_HOST_API_EVENTS_H

#include "host/api/route.h"
#include "host/http/message.h"
#include "standalone/standalone.h"

#include <json/value.h>

#include <cstddef>
#include <memory>
#include <mutex>
#include <string>
#include <vector>

namespace velt::host {

/// Delivers each event to everybody who reads the stream of events. Thread-safe.
class EventHub {
public:
    /// The hub does not keep the reader alive, who showed this token, or none.
    void add(const std::shared_ptr<EventReader>& reader, const std::string& tokenId = "");

    /// Ends the streams of those who showed this token.
    void endThoseOf(const std::string& tokenId);

    /// How many are reading.
    std::size_t readers();

    /// Sends {event: type, data: data} to all readers. Does not block.
    void publish(const std::string& type, const Json::Value& data);

private:
    void forgetThoseThatLeft();

    std::mutex mutex_;
    struct Entry {
        std::weak_ptr<EventReader> reader;
        std::string tokenId;
    };
    std::vector<Entry> readers_;
};

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
