#include "host/api/history.h"

#include "base/json_value.h"
#include "base/number_text.h"
#include "base/utc_text.h"
#include "host/api/audit.h"
#include "host/api/change_summary.h"
#include "host/api/problem.h"
#include "host/api/recorded_change.h"
#include "host/api/settings_document.h"
#include "host/base/json.h"
#include "host/base/query_text.h"
#include "host/base/random_text.h"
#include "host/module/platform_request.h"

#include <algorithm>
#include <exception>
#include <optional>
#include <string_view>
#include <utility>

namespace velt::host {

namespace {

constexpr std::int64_t longestPage = 1000;

Json::Value toObject(const ChangeRecord& change) {
    Json::Value object = jsonObject({{"id", Json::Int64{change.id}},
                                     {"time", timestamp(change.time)},
                                     {"actor", change.actor},
                                     {"address", change.address},
                                     {"way", change.way},
                                     {"state", changeStateName(change.state)},
                                     {"changes", fieldsOf(change)}});
    if (change.confirmBy) {
        object["confirm_by"] = timestamp(*change.confirmBy);
    }
    return object;
}

/// The document without the change, and what stands in the way: fields that have another value since.
struct Undoing {
    Json::Value wanted;
    std::vector<FieldError> conflicts;
};

Undoing undoing(const ChangeRecord& change, const Json::Value& current) {
    Undoing result{current, {}};
    for (const Json::Value& stored : fieldsOf(change)) {
        const Json::Value each = withNamesOfNow(stored);
        Json::Value& place = placeIn(result.wanted, each["field"].asString());
        if (place == each["to"]) {
            place = each["from"];
        } else {
            result.conflicts.push_back(
                {each["field"].asString(), toJson(each["to"]) + ", as the change left it"});
        }
    }
    return result;
}

HttpResponse noSuchChange(const Call& call) {
    return problem(404, "There is no change " + call.path[2] + " in the history.", call.id);
}

/// The change that the path names. Or the problem.
std::variant<ChangeRecord, HttpResponse> namedChange(const Call& call) {
    const auto id = parseNumber(call.path[2]);
    if (!id) {
        return noSuchChange(call);
    }
    auto found = changeRecord(*id);
    if (!found) {
        return problem(500, found.error().message, call.id);
    }
    if (!*found) {
        return noSuchChange(call);
    }
    return std::move(**found);
}

HttpResponse one(const Call& call) {
    const auto change = namedChange(call);
    const auto* const record = std::get_if<ChangeRecord>(&change);
    return record != nullptr ? jsonResponse(200, toObject(*record)) : std::get<HttpResponse>(change);
}

std::variant<ChangeFilter, FieldError> filterIn(const std::string& query) {
    ChangeFilter filter;
    for (const auto& [key, value] : queryParameters(query)) {
        const std::int64_t number = parseNumber(value.value_or("")).value_or(0);
        if (key == "before" && number > 0) {
            filter.beforeId = number;
        } else if (key == "limit" && number > 0 && number <= longestPage) {
            filter.limit = static_cast<int>(number);
        } else {
            return FieldError{key, key == "before"  ? "the id of a change"
                                   : key == "limit" ? "a number from 1 to 1000"
                                                    : "before or limit"};
        }
    }
    return filter;
}

HttpResponse list(const Call& call) {
    const auto filter = filterIn(call.request.query());
    if (const auto* const bad = std::get_if<FieldError>(&filter)) {
        return fieldProblem(400, *bad, "", call.id);
    }
    const auto& wanted = std::get<ChangeFilter>(filter);
    const auto changes = queryChanges(wanted);
    if (!changes) {
        return problem(500, changes.error().message, call.id);
    }
    const bool mayHaveMore = changes->size() == static_cast<std::size_t>(wanted.limit);
    return jsonResponse(
        200, jsonObject({{"next", mayHaveMore ? Json::Value(Json::Int64{changes->back().id}) : Json::Value()},
                         {"changes",
                          jsonArray(*changes, [](const ChangeRecord& each) { return toObject(each); })}}));
}

HttpResponse confirm(HostLog& log, const Call& call) {
    if (auto unread = bodyProblem(call.request.body, call.id)) {
        return std::move(*unread);
    }
    const auto dryRun = parseDryRun(call.request.query());
    if (const auto* const bad = std::get_if<FieldError>(&dryRun)) {
        return fieldProblem(400, *bad, " Nothing was confirmed.", call.id);
    }
    const auto change = namedChange(call);
    const auto* const record = std::get_if<ChangeRecord>(&change);
    if (record == nullptr) {
        return std::get<HttpResponse>(change);
    }
    if (record->state != ChangeState::waiting) {
        return problem(409,
                       "The change " + call.path[2] + " does not wait for a confirmation: it is " +
                           changeStateName(record->state) + ".",
                       call.id);
    }
    const AuditEntry entry{AuditEvent::confirmed, {std::to_string(record->id), {}, {}, {}}};
    if (std::get<bool>(dryRun)) {
        return dryRunAnswer({{StepKind::store, "history"}, stepOf(entry)});
    }
    const auto stored = setChangeState(record->id, ChangeState::confirmed);
    if (!stored) {
        return problem(500, stored.error().message, call.id);
    }
    writeAudit(entry, log, call);
    return {204, "", "", {}};
}

HttpResponse changedSince(const std::vector<FieldError>& conflicts, const Call& call) {
    Json::Value members =
        jsonObject({{"detail", conflicts.front().field + " was changed again since. Nothing was changed."},
                    {"changed", false}});
    for (const FieldError& each : conflicts) {
        members["errors"].append(toObject(each));
    }
    return problemWith(409, std::move(members), call.id);
}

/// "/ftp/timeout and /ftp/portnum"
std::string joined(const std::vector<std::string>& fields) {
    std::string text;
    for (const std::string& each : fields) {
        text += (text.empty() ? "" : " and ") + each;
    }
    return text;
}

/// What it changed is in force no more; so what it undid is in force again, and so on. Where nobody asked for
/// that, what nobody had confirmed still waits until its deadline.
Result<> noteUndone(const ChangeRecord& change, bool asked) {
    bool inForce = false;
    for (std::optional<ChangeRecord> each = change; each; inForce = !inForce) {
        const ChangeState again = each->confirmBy && !asked ? ChangeState::waiting : ChangeState::done;
        VELT_RETURN_IF_ERROR(setChangeState(each->id, inForce ? again : ChangeState::undone));
        const std::int64_t undone = undoneBy(*each);
        // It may be too old for the history.
        VELT_ASSIGN_OR_RETURN(each, undone == 0 ? std::optional<ChangeRecord>() : changeRecord(undone));
    }
    return {};
}

/// Newest first; those that came after the change.
Result<std::vector<ChangeRecord>> changesAfter(std::int64_t id) {
    std::vector<ChangeRecord> later;
    ChangeFilter filter;
    filter.limit = longestPage;
    for (;;) {
        VELT_ASSIGN_OR_RETURN(const auto page, queryChanges(filter));
        for (const ChangeRecord& each : page) {
            if (each.id <= id) {
                return later;
            }
            later.push_back(each);
        }
        if (page.size() < static_cast<std::size_t>(filter.limit)) {
            return later;
        }
        filter.beforeId = page.back().id;
    }
}

/// Whether everything is as the change left it.
bool isInForce(const ChangeRecord& change, Json::Value current) {
    return std::ranges::all_of(fieldsOf(change), [&](const Json::Value& stored) {
        const Json::Value field = withNamesOfNow(stored);
        return placeIn(current, field["field"].asString()) == field["to"];
    });
}

} // namespace

History::History(const ModuleTable& table, AllSettings& settings, HostLog& log)
    : table_(table), settings_(settings), log_(log) {}

std::vector<Route> History::routes() {
    using Kind = RequestOrder::Kind;
    return {
        {"GET", {"api", "history"}, false, Kind::search, list},
        {"GET", {"api", "history", "*"}, false, Kind::unordered, one},
        {"POST",
         {"api", "history", "*", "undo"},
         true,
         Kind::write,
         [this](const Call& call) { return undo(call); }},
        // As a write: it must not come between the look for unconfirmed changes and their undoing.
        {"POST",
         {"api", "history", "*", "confirm"},
         true,
         Kind::write,
         [this](const Call& call) { return confirm(log_, call); }},
    };
}

HttpResponse History::undo(const Call& call) {
    if (auto unread = bodyProblem(call.request.body, call.id)) {
        return std::move(*unread);
    }
    const auto options = parseChangeOptions(call.request.query());
    if (const auto* const bad = std::get_if<FieldError>(&options)) {
        return fieldProblem(400, *bad, " Nothing was changed.", call.id);
    }
    const auto change = namedChange(call);
    const auto* const record = std::get_if<ChangeRecord>(&change);
    if (record == nullptr) {
        return std::get<HttpResponse>(change);
    }
    if (record->state == ChangeState::begun) {
        return problem(409, "The change " + call.path[2] + " is not done.", call.id);
    }
    if (record->state == ChangeState::undone) {
        return problem(409, "The change " + call.path[2] + " is undone already.", call.id);
    }
    const auto current = readSettingsDocument(table_, call.principal);
    if (!current) {
        return failedUnchanged(current.error(), call.id);
    }
    const auto [wanted, conflicts] = undoing(*record, *current);
    if (!conflicts.empty()) {
        return changedSince(conflicts, call);
    }
    HttpResponse response =
        settings_.store(*current, wanted, "undo " + call.path[2], std::get<ChangeOptions>(options), call);
    if (response.status == 200 && !std::get<ChangeOptions>(options).dryRun) {
        if (const auto noted = noteUndone(*record, true); !noted) {
            log_.write(call.id, noted.error().message);
        }
    }
    return response;
}

bool History::takeBackUnconfirmed() {
    ChangeFilter filter;
    filter.state = ChangeState::waiting;
    filter.limit = longestPage;
    const auto waiting = queryChanges(filter);
    if (!waiting) {
        log_.write(waiting.error().message);
        return false;
    }
    bool good = true;
    for (const ChangeRecord& change : *waiting) { // the newest first, as they were laid on each other
        if (change.confirmBy && *change.confirmBy <= std::chrono::system_clock::now()) {
            good = tryToTakeBack(change) && good;
        }
    }
    return good;
}

bool History::tryToTakeBack(const ChangeRecord& change) {
    try {
        return takeBack(change);
    } catch (const std::exception& error) {
        log_.write("cannot take back the unconfirmed change " + std::to_string(change.id) + ": " +
                   error.what());
        return false;
    }
}

bool History::takeBack(const ChangeRecord& change) {
    const std::string id = std::to_string(change.id);
    const Call call{{}, {}, {Role::admin, "", "", "", ""}, nextRequestId()};
    const auto current = readSettingsDocument(table_, call.principal);
    if (!current) {
        log_.write(call.id, current.error().message);
        return false;
    }
    const auto later = changesAfter(change.id);
    if (!later) {
        log_.write(call.id, later.error().message);
        return false;
    }
    const TakingBack back = takingBack(change, *later, *current);
    if (back.any) {
        const HttpResponse response = settings_.store(*current, back.wanted, "undo " + id, {}, call);
        if (response.status != 200) {
            log_.write(call.id, "cannot take back the unconfirmed change " + id + ": " + response.body);
            return false;
        }
    }
    for (const ChangeRecord& each : back.rebased) {
        if (!setChangeFields(each.id, each.fields)) {
            return false;
        }
    }
    return noteTakenBack(change, back);
}

bool History::noteTakenBack(const ChangeRecord& change, const TakingBack& back) {
    const std::string id = std::to_string(change.id);
    const std::string kept = joined(back.kept);
    if (!back.any) {
        const std::string verb = back.kept.size() == 1 ? " was" : " were";
        const auto logged = writeAudit({AuditEvent::superseded, {id, kept + verb, {}, {}}});
        return logged && setChangeState(change.id, ChangeState::superseded);
    }
    const std::string but = kept.empty() ? "" : ", but for " + kept + ", changed again since";
    const auto logged = writeAudit({AuditEvent::takenBack, {id, but, {}, {}}});
    return logged && noteUndone(change, false);
}

void History::settleBegun() {
    ChangeFilter filter;
    filter.state = ChangeState::begun;
    const auto begun = queryChanges(filter);
    if (!begun) {
        log_.write(begun.error().message);
        return;
    }
    for (const ChangeRecord& change : *begun) {
        settle(change);
    }
}

/// Nothing can have come after it but what the administrator did by hand.
void History::settle(const ChangeRecord& change) {
    const std::string id = std::to_string(change.id);
    const PlatformRequest platform(change.actor, change.address);
    const auto current = readSettingsDocument(table_, {Role::admin, change.actor, change.address, "", ""});
    if (!current) {
        log_.write("what became of the change " + id + " is unknown: " + current.error().message);
        return;
    }
    if (!isInForce(change, *current)) {
        if (const auto removed = removeChange(change.id); !removed) {
            log_.write(removed.error().message);
        }
        return;
    }
    log_.write("the change " + id + " was done when veltd ended");
    (void)setChangeState(change.id, change.confirmBy ? ChangeState::waiting : ChangeState::done);
    (void)writeAudit({AuditEvent::settingsChanged, {change.way, summaryOf(changesOf(change)), {}, {}}});
}

} // namespace velt::host
