#include "host/api/user_keys.h"

#include "base/json_value.h"
#include "base/text.h"
#include "base/utc_text.h"
#include "host/api/audit.h"
#include "host/api/changes.h"
#include "host/api/problem.h"
#include "host/base/json.h"
#include "host/base/query_text.h"
#include "host/module/platform_request.h"

#include <chrono>
#include <variant>

namespace velt::host {

namespace {

constexpr const char* noneAdded = " No key was added.";
constexpr const char* noneRemoved = " No key was removed.";

bool hasExpired(const PublicKey& key) {
    return key.options.expires && *key.options.expires <= std::chrono::system_clock::now();
}

Json::Value toObject(const StoredKey& stored) {
    const auto& [key, added, by] = stored.entry;
    const char* const state = hasExpired(key) ? "expired" : "active";
    Json::Value object = jsonObject({{"user", stored.user},
                                     {"fingerprint", key.fingerprint},
                                     {"type", key.type},
                                     {"bits", key.bits},
                                     {"comment", key.comment},
                                     {"state", stored.ofAccount ? state : "former-account"},
                                     {"added", added},
                                     {"by", by}});
    if (!key.options.from.empty()) {
        object["from"] = key.options.from;
    }
    if (key.options.expires) {
        object["expires"] = timestamp(*key.options.expires);
    }
    return object;
}

AuditEntry entryOf(AuditEvent event, const StoredKey& stored) {
    const PublicKey& key = stored.entry.key;
    const std::string about = key.type + (key.comment.empty() ? "" : ", ") + key.comment;
    return {event, {stored.user, key.fingerprint, about, {}}};
}

HttpResponse plan(AuditEvent event, const StoredKey& key) {
    return dryRunAnswer({{StepKind::store, "keys"}, stepOf(entryOf(event, key))});
}

/// "": of all users.
std::variant<std::string, FieldError> parseUser(const std::string& query) {
    const auto parameters = queryParameters(query);
    if (const auto repeated = repeatedKey(parameters)) {
        return FieldError{*repeated, oneValue};
    }
    for (const QueryParameter& parameter : parameters) {
        if (parameter.key != "user") {
            return FieldError{parameter.key, "only user"};
        }
        if (parameter.value.value_or("").empty()) {
            return FieldError{"user", "the name of a user"};
        }
        return *parameter.value;
    }
    return std::string();
}

HttpResponse list(const Call& call) {
    const auto parsed = parseUser(call.request.query());
    if (const auto* const bad = std::get_if<FieldError>(&parsed)) {
        return fieldProblem(400, *bad, "", call.id);
    }
    const auto& user = std::get<std::string>(parsed);
    const auto stored = user.empty() ? storedKeys() : storedKeys(user);
    if (!stored) {
        const bool unknown = stored.error().number == ErrorNumber::notFound;
        return problem(unknown ? 404 : 500, stored.error().message, call.id);
    }
    const auto text = [](const std::string& sentence) { return Json::Value(sentence); };
    return jsonResponse(200, jsonObject({{"keys", jsonArray(stored->keys, toObject)},
                                         {"damaged", jsonArray(stored->damaged, text)}}));
}

struct WantedKey {
    std::string user;
    PublicKey key;
};

std::variant<WantedKey, FieldError> parseWanted(const Json::Value& body) {
    const Json::Value& user = body["user"];
    if (!user.isString() || user.asString().empty()) {
        return FieldError{"user", "the name of a user"};
    }
    const std::string line = body["key"].isString() ? body["key"].asString() : "";
    auto key = parsePublicKey(trimmedEnd(line, "\r\n"));
    if (!key) {
        return FieldError{"key", key.error().message};
    }
    if (hasExpired(*key)) {
        return FieldError{"key", "in expiry-time a time to come"};
    }
    return WantedKey{user.asString(), std::move(*key)};
}

HttpResponse keyPresent(const StoredKey& key, const Call& call) {
    return problem(409,
                   "The key " + key.entry.key.fingerprint + " of " + key.user +
                       " is there already. To change what restricts it, remove it first." + noneAdded,
                   call.id);
}

HttpResponse add(HostLog& log, const WantedKey& wanted, bool dryRun, const Call& call) {
    const PlatformRequest request(call.principal.actor, call.principal.address);
    const auto added = addKey(wanted.user, wanted.key, dryRun ? KeyChange::tryOut : KeyChange::make);
    if (!added && added.error().number == ErrorNumber::invalid) {
        return fieldProblem(422, {"user", added.error().message}, noneAdded, call.id);
    }
    if (!added) {
        log.write(call.id, added.error().message);
        return problem(500, added.error().message + noneAdded, call.id);
    }
    const StoredKey& key = added->key;
    if (!added->isNew) {
        return keyPresent(key, call);
    }
    if (dryRun) {
        return plan(AuditEvent::keyAdded, key);
    }
    log.write(call.id,
              "key " + key.entry.key.fingerprint + " added for " + key.user + " by " + call.principal.actor);
    writeAudit(entryOf(AuditEvent::keyAdded, key), log, call);
    return jsonResponse(201, toObject(key));
}

HttpResponse answerPost(HostLog& log, const Call& call) {
    const auto dryRun = parseDryRun(call.request.query());
    if (const auto* const bad = std::get_if<FieldError>(&dryRun)) {
        return fieldProblem(400, *bad, noneAdded, call.id);
    }
    const auto body = parseObject(call.request.body);
    if (!body) {
        return notAnObject(body.error(), noneAdded, call.id);
    }
    const auto parsed = parseWanted(*body);
    if (const auto* const bad = std::get_if<FieldError>(&parsed)) {
        return fieldProblem(422, *bad, noneAdded, call.id);
    }
    return add(log, std::get<WantedKey>(parsed), std::get<bool>(dryRun), call);
}

HttpResponse remove(HostLog& log, const Call& call) {
    const auto parsed = parseDryRun(call.request.query());
    if (const auto* const bad = std::get_if<FieldError>(&parsed)) {
        return fieldProblem(400, *bad, noneRemoved, call.id);
    }
    const bool dryRun = std::get<bool>(parsed);
    const std::string& user = call.path[2];
    const std::string& fingerprint = call.path[3];
    const auto removed = removeKey(user, fingerprint, dryRun ? KeyChange::tryOut : KeyChange::make);
    const bool unknown = !removed && removed.error().number == ErrorNumber::notFound;
    if (!removed && !unknown) {
        log.write(call.id, removed.error().message);
        return problem(500, removed.error().message + noneRemoved, call.id);
    }
    if (unknown || !*removed) {
        return problem(404, "There is no key " + fingerprint + " of " + user + ".", call.id);
    }
    if (dryRun) {
        return plan(AuditEvent::keyRemoved, **removed);
    }
    log.write(call.id, "key " + fingerprint + " of " + user + " removed by " + call.principal.actor);
    writeAudit(entryOf(AuditEvent::keyRemoved, **removed), log, call);
    return {204, "", "", {}};
}

} // namespace

std::vector<Route> keyRoutes(HostLog& log) {
    using Kind = RequestOrder::Kind;
    return {
        {"GET", {"api", "keys"}, false, Kind::unordered, list},
        {"POST",
         {"api", "keys"},
         true,
         Kind::unordered,
         [&log](const Call& call) { return answerPost(log, call); }},
        {"DELETE",
         {"api", "keys", "*", "*"},
         true,
         Kind::unordered,
         [&log](const Call& call) { return remove(log, call); }},
    };
}

} // namespace velt::host
