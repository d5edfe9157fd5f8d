#include "host/api/log_page.h"

#include "base/json_value.h"
#include "base/number_text.h"
#include "base/text.h"
#include "host/api/problem.h"
#include "host/base/clock.h"
#include "host/base/query_text.h"

#include <algorithm>
#include <array>
#include <charconv>
#include <climits>
#include <cstdio>
#include <functional>

namespace velt::host {

namespace {

constexpr int maxLimit = 1000;

/// A filter has a value that it does not take.
struct BadFilter {
    FieldError error;
};

std::optional<std::int64_t> numberUpTo(std::int64_t most, const std::string& text) {
    const auto value = parseNumber(text);
    return value && *value > 0 && *value <= most ? value : std::nullopt;
}

/// "0x11B00012", or the same number in decimal.
std::optional<unsigned> eventNumber(const std::string& text) {
    if (!lowerCase(text).starts_with("0x")) {
        return numberUpTo(UINT_MAX, text);
    }
    unsigned value = 0;
    const char* const end = text.data() + text.size();
    const auto [stop, error] = std::from_chars(text.data() + 2, end, value, 16);
    return error == std::errc() && stop == end ? std::optional(value) : std::nullopt;
}

/// `take` returns false for a value other than the expected.
struct Filter {
    const char* key;
    const char* expected;
    bool (*take)(const std::string& value, LogFilter& filter);
};

constexpr std::array<Filter, 5> filters{{
    {"since", "a time such as 2026-11-21T06:30:00Z",
     [](const std::string& value, LogFilter& filter) {
         filter.since = parseTimestamp(value);
         return filter.since.has_value();
     }},
    {"event", "an event number such as 0x11B00012",
     [](const std::string& value, LogFilter& filter) {
         filter.event = eventNumber(value);
         return filter.event.has_value();
     }},
    {"actor", "a name",
     [](const std::string& value, LogFilter& filter) {
         filter.actor = value;
         return true;
     }},
    {"before", "the id of an entry",
     [](const std::string& value, LogFilter& filter) {
         filter.beforeId = numberUpTo(INT64_MAX, value);
         return filter.beforeId.has_value();
     }},
    {"limit", "a number from 1 to 1000",
     [](const std::string& value, LogFilter& filter) {
         filter.limit = static_cast<int>(numberUpTo(maxLimit, value).value_or(0));
         return filter.limit > 0;
     }},
}};

void takeFilter(const QueryParameter& parameter, LogFilter& filter) {
    const auto& [key, value] = parameter;
    if (!value) {
        throw BadFilter{{key, "a percent-encoded value in UTF-8"}};
    }
    const auto* const known = std::ranges::find(filters, key, &Filter::key);
    if (known == filters.end()) {
        throw BadFilter{{key, "one of since, event, actor, before or limit"}};
    }
    // An empty filter lets everything through.
    if (!value->empty() && !known->take(*value, filter)) {
        throw BadFilter{{key, known->expected}};
    }
}

/// Reads "since=...&event=...". Throws BadFilter.
LogFilter parseQuery(const std::string& query) {
    LogFilter filter;
    for (const QueryParameter& parameter : queryParameters(query)) {
        takeFilter(parameter, filter);
    }
    return filter;
}

/// What "before" has to be for the next page; null when there is none.
Result<Json::Value> nextAfter(const std::vector<LogEntry>& page, LogFilter filter) {
    if (page.size() < static_cast<std::size_t>(filter.limit)) {
        return Json::Value();
    }
    filter.beforeId = page.back().id;
    filter.limit = 1;
    VELT_ASSIGN_OR_RETURN(const auto rest, queryLog(filter));
    return rest.empty() ? Json::Value() : Json::Value(Json::Int64{page.back().id});
}

HttpResponse answerPage(const LogFilter& filter, const Call& call) {
    const auto page = queryLog(filter);
    const auto next = page ? nextAfter(*page, filter) : page.error();
    if (!next) {
        return problem(500, next.error().message, call.id);
    }
    const auto describe = [](const LogEntry& entry) { return toObject(entry); };
    return jsonResponse(200, jsonObject({{"next", *next}, {"entries", jsonArray(*page, describe)}}));
}

} // namespace

Json::Value toObject(const LogEntry& entry) {
    std::array<char, 16> event{};
    std::snprintf(event.data(), event.size(), "0x%08X", entry.event);
    return jsonObject({{"id", Json::Int64{entry.id}},
                       {"time", timestamp(entry.time)},
                       {"category", entry.category},
                       {"level", entry.level},
                       {"event", event.data()},
                       {"text", entry.sentence},
                       {"args", jsonArray(entry.texts, std::identity())},
                       {"actor", entry.actor},
                       {"address", entry.address}});
}

Route logRoute() {
    return {"GET", {"api", "log"}, false, RequestOrder::Kind::search, [](const Call& call) {
                try {
                    return answerPage(parseQuery(call.request.query()), call);
                } catch (const BadFilter& bad) {
                    return fieldProblem(400, bad.error, "", call.id);
                }
            }};
}

} // namespace velt::host
