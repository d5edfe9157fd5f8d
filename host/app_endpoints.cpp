// The host's own endpoints.

#include "host/admin_log_json.h"
#include "host/app.h"
#include "host/json_text.h"
#include "host/problem.h"
#include "host/services.h"

#include <utility>

namespace velt::host {

namespace {

constexpr std::size_t maxTokenName = 64;

/// A name that can stand in logs: not empty, no control characters.
bool isTokenName(const std::string& name) {
    for (const char c : name) {
        if (static_cast<unsigned char>(c) < 0x20 || c == 0x7F) {
            return false;
        }
    }
    return !name.empty() && name.size() <= maxTokenName;
}

constexpr const char* noTokenMade = " No token was made.";

using LogEntries = std::vector<AdminLogEntry>;

/// The next entry after a page, if there is one. Nothing, with the reason in `error`, when that cannot be
/// read.
std::optional<LogEntries> entriesAfter(const LogEntries& page, AdminLogQuery query, std::string& error) {
    if (page.size() < static_cast<std::size_t>(query.limit)) {
        return LogEntries{};
    }
    query.beforeId = page.back().id;
    query.limit = 1;
    return queryAdminLog(query, error);
}

} // namespace

const std::vector<App::Endpoint>& App::endpoints() {
    using Kind = RequestOrder::Kind;
    static const std::vector<Endpoint> all{
        {"GET", {"api"}, false, Kind::unordered, &App::listRows},
        {"GET", {"healthz"}, false, Kind::unordered, &App::health},
        {"GET", {"openapi.json"}, false, Kind::unordered, &App::openApi},
        {"GET", {"metrics"}, false, Kind::read, &App::metrics},
        {"GET", {"api", "status"}, false, Kind::read, &App::status},
        {"GET", {"api", "log"}, false, Kind::unordered, &App::adminLog},
        {"GET", {"api", "tokens"}, true, Kind::unordered, &App::listTokens},
        {"POST", {"api", "tokens"}, true, Kind::unordered, &App::createToken},
        {"DELETE", {"api", "tokens", "*"}, true, Kind::unordered, &App::deleteToken},
    };
    return all;
}

HttpResponse App::listRows(const Job&) {
    Json::Value value(Json::objectValue);
    value["rows"] = Json::Value(Json::arrayValue);
    for (const Row* row : table_.rows()) {
        Json::Value object(Json::objectValue);
        object["api"] = row->api;
        object["version"] = row->version;
        object["method"] = row->method;
        object["read"] = row->reads();
        value["rows"].append(object);
    }
    return jsonResponse(200, value);
}

HttpResponse App::health(const Job&) {
    Json::Value value(Json::objectValue);
    const std::vector<ServiceDown> down = servicesDown();
    value["status"] = down.empty() ? "ok" : "degraded";
    for (const ServiceDown& each : down) {
        value["down"].append(toObject(each));
    }
    return jsonResponse(200, value);
}

HttpResponse App::openApi(const Job&) {
    return {200, "application/json", openApi_.text(), {}};
}

HttpResponse App::metrics(const Job& job) {
    for (const Service& each : listServices(table_, job.principal)) {
        metrics_.setService(each.name, each.wanted.value_or(true), each.running);
    }
    for (const auto& [daemon, restarts] : daemonRestarts()) {
        metrics_.setDaemonRestarts(daemon, restarts);
    }
    metrics_.setEventReaders(events_.readers());
    return {200, "text/plain; version=0.0.4; charset=utf-8", metrics_.text(), {}};
}

HttpResponse App::status(const Job& job) {
    Json::Value value(Json::objectValue);
    value["version"] = VELT_VERSION;
    const auto uptime = std::chrono::steady_clock::now() - start_;
    value["uptime_seconds"] = Json::Int64{std::chrono::duration_cast<std::chrono::seconds>(uptime).count()};
    value["services"] = Json::Value(Json::arrayValue);
    for (const Service& each : listServices(table_, job.principal)) {
        value["services"].append(toObject(each));
    }
    return jsonResponse(200, value);
}

HttpResponse App::adminLog(const Job& job) {
    FieldError wrong;
    auto query = parseLogQuery(job.request.query(), wrong);
    if (!query) {
        return fieldProblem(400, wrong, "", job.id);
    }
    std::string error;
    const auto page = queryAdminLog(*query, error);
    const auto rest = page ? entriesAfter(*page, *query, error) : std::nullopt;
    if (!rest) {
        return problem(500, error, job.id);
    }
    Json::Value value(Json::objectValue);
    value["next"] = rest->empty() ? Json::Value() : Json::Value(Json::Int64{page->back().id});
    value["entries"] = Json::Value(Json::arrayValue);
    for (const AdminLogEntry& entry : *page) {
        value["entries"].append(toObject(entry));
    }
    return jsonResponse(200, value);
}

HttpResponse App::listTokens(const Job&) {
    Json::Value value(Json::objectValue);
    value["tokens"] = Json::Value(Json::arrayValue);
    for (const Token& token : tokens_.tokens()) {
        value["tokens"].append(toObject(token));
    }
    return jsonResponse(200, value);
}

HttpResponse App::createToken(const Job& job) {
    const ParsedObject parsed = parseObject(job.request.body);
    if (!parsed.error.empty()) {
        return problem(400, "The body is no JSON object: " + parsed.error + "." + noTokenMade, job.id);
    }
    const Json::Value& name = parsed.value["name"];
    const Json::Value& role = parsed.value["role"];
    if (!name.isString() || !isTokenName(name.asString())) {
        return fieldProblem(422, {"name", "a text of 1 to 64 bytes without control characters"}, noTokenMade,
                            job.id);
    }
    const auto known = role.isString() ? roleNamed(role.asString()) : std::nullopt;
    if (!known) {
        return fieldProblem(422, {"role", "\"admin\" or \"viewer\""}, noTokenMade, job.id);
    }
    Token created;
    const std::string token = tokens_.create(name.asString(), *known, created);
    log_.write(job.id, "token " + created.id + " made for " + created.name + " (" + roleName(created.role) +
                           ") by " + job.principal.actor);
    Json::Value value = toObject(created);
    value.removeMember("created");
    value["token"] = token;
    return jsonResponse(201, value);
}

HttpResponse App::deleteToken(const Job& job) {
    const std::string& id = job.path.back();
    if (!tokens_.remove(id)) {
        return problem(404, "There is no token with the id " + id + ".", job.id);
    }
    log_.write(job.id, "token " + id + " removed by " + job.principal.actor);
    return {204, "", "", {}};
}

} // namespace velt::host
