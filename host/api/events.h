// /events: what happens, as it happens.
#ifndef VELT_HOST_API_EVENTS_H
#define VELT_HOST_API_EVENTS_H

#include "host/api/problem.h"
#include "host/api/route.h"
#include "host/http/message.h"
#include "standalone/standalone.h"

#include <json/value.h>

#include <cstddef>
#include <memory>
#include <mutex>
#include <set>
#include <string>
#include <variant>
#include <vector>

namespace velt::host {

/// "service", "log", ...
using EventKinds = std::set<std::string>;

/// Those of who asks for none: all but what users do, of which there may be thousands in a second.
const EventKinds& usualEventKinds();

/// Reads "kinds=session,transfer". Or the parameter that is wrong.
std::variant<EventKinds, FieldError> parseEventKinds(const std::string& query);

/// The kinds that a good query asks for.
EventKinds kindsIn(const std::string& query);

/// Delivers each event to everybody who reads events of its kind. Thread-safe.
class EventHub {
public:
    /// The hub does not keep the reader alive, who showed this token, or none.
    void add(const std::shared_ptr<EventReader>& reader, const std::string& tokenId = "",
             EventKinds kinds = usualEventKinds());

    /// Ends the streams of those who showed this token.
    void endThoseOf(const std::string& tokenId);

    /// How many are reading.
    std::size_t readers();

    /// Whether anybody reads events of this kind.
    bool isWanted(const std::string& kind);

    /// Sends {event: kind, data: data} to all who read events of this kind. Does not block.
    void publish(const std::string& kind, const Json::Value& data);

private:
    void forgetThoseThatLeft();

    std::mutex mutex_;
    struct Entry {
        std::weak_ptr<EventReader> reader;
        std::string tokenId;
        EventKinds kinds;
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
