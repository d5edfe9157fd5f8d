#include "host/admin_log_json.h"

#include "host/clock.h"
#include "host/percent_encoding.h"

#include <algorithm>
#include <array>
#include <charconv>
#include <cstdio>
#include <sstream>

namespace velt::host {

namespace {

constexpr int maxLimit = 1000;

std::optional<unsigned> hexDigits(std::string_view text) {
    unsigned value = 0;
    const auto [stop, error] = std::from_chars(text.data(), text.data() + text.size(), value, 16);
    return error == std::errc() && stop == text.data() + text.size() ? std::optional(value) : std::nullopt;
}

/// Forms write a blank as "+".
std::optional<std::string> queryValue(std::string text) {
    std::replace(text.begin(), text.end(), '+', ' ');
    return percentDecoded(text);
}

std::optional<std::int64_t> positiveNumber(const std::string& text) {
    std::int64_t value = 0;
    const char* const end = text.data() + text.size();
    const auto [stop, error] = std::from_chars(text.data(), end, value);
    return error == std::errc() && stop == end && value > 0 ? std::optional(value) : std::nullopt;
}

/// "0x11B00012", or the same number in decimal.
std::optional<std::uint32_t> eventNumber(const std::string& text) {
    if (text.starts_with("0x") || text.starts_with("0X")) {
        return hexDigits(std::string_view(text).substr(2));
    }
    const auto number = positiveNumber(text);
    return number && *number <= UINT32_MAX ? std::optional(static_cast<std::uint32_t>(*number))
                                           : std::nullopt;
}

bool isFilter(const std::string& key) {
    constexpr std::array<const char*, 5> filters{"since", "event", "actor", "before", "limit"};
    return std::find(filters.begin(), filters.end(), key) != filters.end();
}

/// Takes over one filter; returns what its value must be when it is not that, "" when all is well.
std::string takeFilter(const std::string& key, const std::string& value, AdminLogQuery& query) {
    if (key == "since") {
        query.sinceMilliseconds = parseTimestamp(value);
        return query.sinceMilliseconds ? "" : "a moment such as 2026-11-21T06:30:00Z";
    }
    if (key == "event") {
        query.event = eventNumber(value);
        return query.event ? "" : "an event number such as 0x11B00012";
    }
    if (key == "actor") {
        query.actor = value;
        return "";
    }
    if (key == "before") {
        query.beforeId = positiveNumber(value);
        return query.beforeId ? "" : "the id of an entry";
    }
    if (key == "limit") {
        const auto limit = positiveNumber(value);
        query.limit = static_cast<int>(limit && *limit <= maxLimit ? *limit : 0);
        return query.limit > 0 ? "" : "a number from 1 to " + std::to_string(maxLimit);
    }
    return "one of since, event, actor, before and limit";
}

} // namespace

Json::Value toObject(const AdminLogEntry& entry) {
    std::array<char, 16> event{};
    std::snprintf(event.data(), event.size(), "0x%08X", entry.event);
    Json::Value object(Json::objectValue);
    object["id"] = Json::Int64{entry.id};
    object["time"] = timestamp(entry.milliseconds);
    object["category"] = entry.category;
    object["level"] = entry.level;
    object["event"] = event.data();
    object["text"] = entry.text;
    object["args"] = Json::Value(Json::arrayValue);
    for (const std::string& argument : entry.arguments) {
        object["args"].append(argument);
    }
    object["actor"] = entry.actor;
    object["address"] = entry.address;
    return object;
}

std::optional<AdminLogQuery> parseLogQuery(const std::string& query, FieldError& error) {
    AdminLogQuery parsed;
    std::istringstream parts(query);
    for (std::string part; std::getline(parts, part, '&');) {
        const std::size_t equals = part.find('=');
        error.field = part.substr(0, equals);
        const auto value = queryValue(equals == std::string::npos ? "" : part.substr(equals + 1));
        if (!value) {
            error.expected = "a percent-encoded value in UTF-8";
            return std::nullopt;
        }
        // An empty filter does not narrow.
        const bool empty = value->empty() && isFilter(error.field);
        error.expected = empty ? "" : takeFilter(error.field, *value, parsed);
        if (!error.expected.empty()) {
            return std::nullopt;
        }
    }
    return parsed;
}

} // namespace velt::host
