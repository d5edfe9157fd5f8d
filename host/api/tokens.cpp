#include "host/api/tokens.h"

#include "base/json_value.h"
#include "base/utf8.h"
#include "host/api/audit.h"
#include "host/api/changes.h"
#include "host/api/problem.h"
#include "host/base/json.h"

#include <algorithm>
#include <variant>

namespace velt::host {

namespace {

constexpr std::size_t maxName = 64;
constexpr const char* noneMade = " No token was created.";

/// A name by which logs and people know the token: what can be seen, so that no two names look the same.
bool isName(const Json::Value& value) {
    const std::string name = value.isString() ? value.asString() : "";
    return !name.empty() && name.size() <= maxName && !holdsUnseen(name) && name.front() != ' ' &&
           name.back() != ' ' && name.find("  ") == std::string::npos;
}

HttpResponse list(const TokenStore& store) {
    const auto describe = [](const Token& token) { return toObject(token); };
    return jsonResponse(200, jsonObject({{"tokens", jsonArray(store.tokens(), describe)}}));
}

constexpr const char* noneDeleted = " No token was deleted.";

AuditEntry entryOf(AuditEvent event, const Token& token) {
    return {event, {token.name, roleName(token.role), token.id, {}}};
}

bool isTaken(const TokenStore& store, const std::string& name) {
    const auto tokens = store.tokens();
    return std::ranges::find(tokens, name, &Token::name) != tokens.end();
}

HttpResponse nameTaken(const Call& call) {
    return problem(409, TokenNameTaken::sentence + std::string(noneMade), call.id);
}

struct WantedToken {
    std::string name;
    Role role = Role::viewer;
};

std::variant<WantedToken, FieldError> parseWanted(const Json::Value& body) {
    const Json::Value& name = body["name"];
    if (!isName(name)) {
        return FieldError{
            "name",
            "a string of 1 to 64 bytes of characters that can be seen, with single blanks between them"};
    }
    const Json::Value& word = body["role"];
    const auto role = word.isString() ? roleNamed(word.asString()) : std::nullopt;
    if (!role) {
        return FieldError{"role", "\"admin\" or \"viewer\""};
    }
    return WantedToken{name.asString(), *role};
}

HttpResponse create(TokenStore& store, HostLog& log, const Call& call) {
    const auto dryRun = parseDryRun(call.request.query());
    if (const auto* const bad = std::get_if<FieldError>(&dryRun)) {
        return fieldProblem(400, *bad, noneMade, call.id);
    }
    const auto body = parseObject(call.request.body);
    if (!body) {
        return notAnObject(body.error(), noneMade, call.id);
    }
    const auto parsed = parseWanted(*body);
    if (const auto* const bad = std::get_if<FieldError>(&parsed)) {
        return fieldProblem(422, *bad, noneMade, call.id);
    }
    const auto& [name, role] = std::get<WantedToken>(parsed);
    if (std::get<bool>(dryRun)) {
        return isTaken(store, name)
                   ? nameTaken(call)
                   : dryRunAnswer(
                         {{StepKind::store, "tokens"},
                          stepOf(entryOf(AuditEvent::tokenMade, {"not known yet", name, role, {}, {}}))});
    }
    NewToken made;
    try {
        made = store.create(name, role);
    } catch (const TokenNameTaken&) {
        return nameTaken(call);
    }
    const auto& [token, text] = made;
    log.write(call.id, "token " + token.id + " created for " + token.name + " (" + roleName(token.role) +
                           ") by " + call.principal.actor);
    writeAudit(entryOf(AuditEvent::tokenMade, token), log, call);
    Json::Value value = toObject(token);
    value.removeMember("created");
    value["token"] = text;
    return jsonResponse(201, value);
}

HttpResponse remove(TokenStore& store, EventHub& events, HostLog& log, const Call& call) {
    const auto dryRun = parseDryRun(call.request.query());
    if (const auto* const bad = std::get_if<FieldError>(&dryRun)) {
        return fieldProblem(400, *bad, noneDeleted, call.id);
    }
    const std::string& id = call.path.back();
    const auto tokens = store.tokens();
    const auto token = std::ranges::find(tokens, id, &Token::id);
    const bool found = token != tokens.end();
    if (found && std::get<bool>(dryRun)) {
        return dryRunAnswer({{StepKind::store, "tokens"}, stepOf(entryOf(AuditEvent::tokenDeleted, *token))});
    }
    if (!found || !store.remove(id)) {
        return problem(404, "There is no token with the id " + id + ".", call.id);
    }
    events.endThoseOf(id);
    log.write(call.id, "token " + id + " deleted by " + call.principal.actor);
    writeAudit(entryOf(AuditEvent::tokenDeleted, *token), log, call);
    return {204, "", "", {}};
}

} // namespace

std::vector<Route> tokenRoutes(TokenStore& store, EventHub& events, HostLog& log) {
    using Kind = RequestOrder::Kind;
    return {
        {"GET", {"api", "tokens"}, true, Kind::unordered, [&store](const Call&) { return list(store); }},
        {"POST",
         {"api", "tokens"},
         true,
         Kind::unordered,
         [&](const Call& call) { return create(store, log, call); }},
        {"DELETE",
         {"api", "tokens", "*"},
         true,
         Kind::unordered,
         [&](const Call& call) { return remove(store, events, log, call); }},
    };
}

} // namespace velt::host
