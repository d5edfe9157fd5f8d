#include "host/api/tokens.h"

#include "base/json_value.h"
#include "base/utf8.h"
#include "host/api/problem.h"
#include "host/base/json.h"

namespace velt::host {

namespace {

constexpr std::size_t maxName = 64;
constexpr const char* noneMade = " No token was created.";

/// A name that is safe in logs: not empty, without characters that steer a terminal or turn the text around
/// them.
bool isName(const Json::Value& value) {
    const std::string name = value.isString() ? value.asString() : "";
    return !name.empty() && name.size() <= maxName && !holdsSteering(name);
}

HttpResponse list(const TokenStore& store) {
    const auto describe = [](const Token& token) { return toObject(token); };
    return jsonResponse(200, jsonObject({{"tokens", jsonArray(store.tokens(), describe)}}));
}

HttpResponse create(TokenStore& store, HostLog& log, const Call& call) {
    const auto body = parseObject(call.request.body);
    if (!body) {
        return notAnObject(body.error(), noneMade, call.id);
    }
    const Json::Value& name = (*body)["name"];
    if (!isName(name)) {
        return fieldProblem(422,
                            {"name", "a string of 1 to 64 bytes without control and direction characters"},
                            noneMade, call.id);
    }
    const Json::Value& word = (*body)["role"];
    const auto role = word.isString() ? roleNamed(word.asString()) : std::nullopt;
    if (!role) {
        return fieldProblem(422, {"role", "\"admin\" or \"viewer\""}, noneMade, call.id);
    }
    const auto [token, text] = store.create(name.asString(), *role);
    log.write(call.id, "token " + token.id + " created for " + token.name + " (" + roleName(token.role) +
                           ") by " + call.principal.actor);
    Json::Value value = toObject(token);
    value.removeMember("created");
    value["token"] = text;
    return jsonResponse(201, value);
}

HttpResponse remove(TokenStore& store, HostLog& log, const Call& call) {
    const std::string& id = call.path.back();
    if (!store.remove(id)) {
        return problem(404, "There is no token with the id " + id + ".", call.id);
    }
    log.write(call.id, "token " + id + " removed by " + call.principal.actor);
    return {204, "", "", {}};
}

} // namespace

std::vector<Route> tokenRoutes(TokenStore& store, HostLog& log) {
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
         [&](const Call& call) { return remove(store, log, call); }},
    };
}

} // namespace velt::host
