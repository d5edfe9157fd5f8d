#include "host/api/events.h"

#include "base/json_value.h"
#include "host/api/log_page.h"
#include "host/base/json.h"
#include "host/base/query_text.h"

#include <algorithm>
#include <sstream>
#include <utility>

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

const EventKinds& usualEventKinds() {
    static const EventKinds usual{"service", "log", "ban", "change"};
    return usual;
}

std::variant<EventKinds, FieldError> parseEventKinds(const std::string& query) {
    static const EventKinds known{"service", "log", "ban", "change", "session", "transfer", "operation"};
    const auto parameters = queryParameters(query);
    if (parameters.empty()) {
        return usualEventKinds();
    }
    if (parameters.size() > 1 || parameters[0].key != "kinds") {
        const bool repeated = parameters[0].key == "kinds" && repeatedKey(parameters);
        return FieldError{parameters.back().key, repeated ? oneValue : "only kinds"};
    }
    EventKinds kinds;
    std::istringstream names(parameters[0].value.value_or(""));
    for (std::string name; std::getline(names, name, ',');) {
        kinds.insert(name);
    }
    if (kinds.empty() || !std::ranges::includes(known, kinds)) {
        return FieldError{"kinds", "one or several of service, log, ban, change, session, transfer or "
                                   "operation, separated by commas"};
    }
    return kinds;
}

EventKinds kindsIn(const std::string& query) {
    auto kinds = parseEventKinds(query);
    return std::holds_alternative<EventKinds>(kinds) ? std::get<EventKinds>(std::move(kinds)) : EventKinds();
}

void EventHub::add(const std::shared_ptr<EventReader>& reader, const std::string& tokenId, EventKinds kinds) {
    const std::lock_guard lock(mutex_);
    // Readers may come and go for a long time without an event.
    forgetThoseThatLeft();
    readers_.push_back({reader, tokenId, std::move(kinds)});
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

bool EventHub::isWanted(const std::string& kind) {
    const std::lock_guard lock(mutex_);
    return std::ranges::any_of(
        readers_, [&](const Entry& each) { return each.kinds.contains(kind) && !each.reader.expired(); });
}

void EventHub::publish(const std::string& kind, const Json::Value& data) {
    // The JSON has no line breaks, so one data line is enough.
    const auto event =
        std::make_shared<const std::string>("event: " + kind + "\ndata: " + toJson(data) + "\n\n");
    const std::lock_guard lock(mutex_);
    for (const Entry& each : readers_) {
        const auto reader = each.kinds.contains(kind) ? each.reader.lock() : nullptr;
        if (reader) {
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
    const auto isGood = [](const std::string& query) {
        return std::holds_alternative<EventKinds>(parseEventKinds(query));
    };
    const auto refuse = [](const Call& call) {
        return fieldProblem(400, std::get<FieldError>(parseEventKinds(call.request.query())), "", call.id);
    };
    return {"GET", {"events"}, false, RequestOrder::Kind::unordered, refuse, false, isGood};
}

} // namespace velt::host
