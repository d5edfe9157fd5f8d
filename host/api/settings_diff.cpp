#include "host/api/settings_diff.h"

#include "base/json_value.h"
#include "base/number_text.h"
#include "host/api/problem.h"
#include "host/api/recorded_change.h"
#include "host/api/settings_document.h"
#include "host/base/json.h"

#include <algorithm>
#include <array>
#include <cstdint>
#include <optional>
#include <variant>

namespace velt::host {

namespace {

constexpr int pageOfChanges = 1000;
constexpr const char* states = "the id of a change, \"now\", or a document as /api/settings answers it";

/// What a caller asked for, or the problem with it.
using Settings = std::variant<Json::Value, HttpResponse>;

/// Whether the state after this change can be told: it is kept, or the one that followed it is.
Result<bool> isKnown(std::int64_t id) {
    for (const std::int64_t kept : {id, id + 1}) {
        VELT_ASSIGN_OR_RETURN(const auto found, changeRecord(kept));
        if (found) {
            return true;
        }
    }
    return false;
}

void takeBack(const ChangeRecord& change, Json::Value& document) {
    for (const Json::Value& each : fieldsOf(change)) {
        placeIn(document, each["field"].asString()) = each["from"];
    }
}

/// Takes back all later changes, the newest first. A change that was never done left its fields as it found
/// them, so that taking it back does as well.
Result<Json::Value> settingsAfter(std::int64_t id, Json::Value document) {
    ChangeFilter filter;
    filter.limit = pageOfChanges;
    while (true) {
        VELT_ASSIGN_OR_RETURN(const auto changes, queryChanges(filter));
        for (const ChangeRecord& change : changes) {
            if (change.id <= id) {
                return document;
            }
            takeBack(change, document);
        }
        if (changes.size() < static_cast<std::size_t>(filter.limit)) {
            return document;
        }
        filter.beforeId = changes.back().id;
    }
}

Settings settingsAt(std::int64_t id, const ModuleTable& table, const Call& call) {
    const auto known = isKnown(id);
    if (!known) {
        return problem(500, known.error().message, call.id);
    }
    if (!*known) {
        return problem(404, "There is no change " + std::to_string(id) + " in the history.", call.id);
    }
    auto current = readSettingsDocument(table, call.principal);
    if (!current) {
        return problem(500, current.error().message, call.id);
    }
    auto then = settingsAfter(id, std::move(*current));
    if (!then) {
        return problem(500, then.error().message, call.id);
    }
    return std::move(*then);
}

HttpResponse getSettingsAt(const ModuleTable& table, const Call& call) {
    const auto id = parseNumber(call.path[2]);
    if (!id) {
        return problem(404, "There is no change " + call.path[2] + " in the history.", call.id);
    }
    const auto settings = settingsAt(*id, table, call);
    const auto* const document = std::get_if<Json::Value>(&settings);
    return document != nullptr ? jsonResponse(200, *document) : std::get<HttpResponse>(settings);
}

/// The document of another server or time, which may lack some of today's settings.
bool isDocument(const Json::Value& value) {
    static constexpr std::array sections{&schema::ftp, &schema::security, &schema::sftp};
    const std::string rules(rulesSection);
    return value.isObject() && value["format"] == "velt-settings" &&
           (!value.isMember(rules) || value[rules].isArray()) &&
           std::ranges::all_of(sections, [&](const schema::SettingGroup* group) {
               return !value.isMember(group->name) || value[group->name].isObject();
           });
}

/// What `value`, the member `name` of the request, stands for.
Settings namedSettings(const Json::Value& value, const char* name, const ModuleTable& table,
                       const Call& call) {
    if (value.isInt64()) {
        return settingsAt(value.asInt64(), table, call);
    }
    if (value == "now") {
        auto document = readSettingsDocument(table, call.principal);
        return document ? Settings(std::move(*document)) : problem(500, document.error().message, call.id);
    }
    if (isDocument(value)) {
        return value;
    }
    return fieldProblem(422, {name, states}, "", call.id);
}

/// Leaves in the one document what the other has, too.
void leaveCommon(Json::Value& document, const Json::Value& other) {
    for (const std::string& name : document.getMemberNames()) {
        if (!other.isMember(name)) {
            document.removeMember(name);
        } else if (document[name].isObject()) {
            leaveCommon(document[name], other[name]);
        }
    }
}

HttpResponse diff(const ModuleTable& table, const Call& call) {
    const auto body = parseObject(call.request.body);
    if (!body) {
        return notAnObject(body.error(), "", call.id);
    }
    std::array<Json::Value, 2> documents;
    static constexpr std::array names{"from", "to"};
    for (std::size_t i = 0; i < documents.size(); ++i) {
        auto settings = namedSettings((*body)[names[i]], names[i], table, call);
        if (auto* const refusal = std::get_if<HttpResponse>(&settings)) {
            return std::move(*refusal);
        }
        documents[i] = std::move(std::get<Json::Value>(settings));
    }
    leaveCommon(documents[0], documents[1]);
    leaveCommon(documents[1], documents[0]);
    const auto changes = differences(documents[0], documents[1]);
    return jsonResponse(200, jsonObject({{"changes", jsonArray(changes, [](const FieldChange& each) {
                                              return toObject(each);
                                          })}}));
}

} // namespace

std::vector<Route> settingsDiffRoutes(const ModuleTable& table) {
    using Kind = RequestOrder::Kind;
    return {
        {"GET",
         {"api", "history", "*", "settings"},
         false,
         Kind::read,
         [&table](const Call& call) { return getSettingsAt(table, call); }},
        {"POST",
         {"api", "diff"},
         false,
         Kind::read,
         [&table](const Call& call) { return diff(table, call); },
         true},
    };
}

} // namespace velt::host
