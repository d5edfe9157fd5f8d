// The host's own endpoints.

#include "host/admin_log_json.h"
#include "host/app.h"
#include "host/json_text.h"
#include "host/module_call.h"
#include "host/problem.h"
#include "host/stored_switches.h"

#include <utility>

namespace velt::host {

namespace {

constexpr const char* ftpApi = "VELT.Core.FileServ.FTP";
constexpr const char* sftpApi = "VELT.Core.FileServ.FTP.SFTP";
constexpr std::size_t maxTokenName = 64;

Json::Value service(const char* name, const Json::Value& enabled, const Json::Value& port) {
    Json::Value object(Json::objectValue);
    object["name"] = name;
    object["enabled"] = enabled;
    object["port"] = port;
    return object;
}

/// Adds "wanted" to each service: whether the stored settings ask for it, running or not.
void addWanted(Json::Value& services) {
    const auto stored = readStoredSwitches();
    for (Json::Value& each : services) {
        if (stored) {
            const std::string name = each["name"].asString();
            each["wanted"] = name == "sftp" ? stored->sftp : name == "ftps" ? stored->ftps : stored->ftp;
        }
    }
}

Json::Value toObject(const Token& token) {
    Json::Value object(Json::objectValue);
    object["id"] = token.id;
    object["name"] = token.name;
    object["role"] = roleName(token.role);
    object["created"] = token.created;
    return object;
}

/// A name that can stand in logs: not empty, no control characters.
bool isTokenName(const std::string& name) {
    for (const char c : name) {
        if (static_cast<unsigned char>(c) < 0x20 || c == 0x7F) {
            return false;
        }
    }
    return !name.empty() && name.size() <= maxTokenName;
}

HttpResponse badToken(const std::string& field, const std::string& expected, const std::string& requestId) {
    Json::Value members(Json::objectValue);
    members["detail"] = field + ": expected " + expected + ". No token was made.";
    Json::Value error(Json::objectValue);
    error["field"] = field;
    error["expected"] = expected;
    members["errors"].append(error);
    return problemWith(422, std::move(members), requestId);
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
    value["status"] = "ok";
    return jsonResponse(200, value);
}

HttpResponse App::openApi(const Job&) {
    return {200, "application/json", openApi_.text(), {}};
}

HttpResponse App::metrics(const Job& job) {
    for (const Json::Value& each : services(job.principal)) {
        metrics_.setServiceUp(each["name"].asString(), each["enabled"].asBool());
    }
    return {200, "text/plain; version=0.0.4; charset=utf-8", metrics_.text(), {}};
}

Json::Value App::services(const Principal& principal) {
    Json::Value list(Json::arrayValue);
    const Json::Value none(Json::objectValue);
    if (const Row* const row = table_.find(ftpApi, 3, "get")) {
        const Outcome ftp = callRow(*row, none, principal);
        if (ftp.kind == Outcome::Kind::success) {
            list.append(service("ftp", ftp.data["enable_ftp"], ftp.data["portnum"]));
            list.append(service("ftps", ftp.data["enable_ftps"], ftp.data["portnum"]));
        }
    }
    if (const Row* const row = table_.find(sftpApi, 1, "get")) {
        const Outcome sftp = callRow(*row, none, principal);
        if (sftp.kind == Outcome::Kind::success) {
            list.append(service("sftp", sftp.data["enable"], sftp.data["portnum"]));
        }
    }
    return list;
}

HttpResponse App::status(const Job& job) {
    Json::Value value(Json::objectValue);
    value["version"] = VELT_VERSION;
    const auto uptime = std::chrono::steady_clock::now() - start_;
    value["uptime_seconds"] = Json::Int64{std::chrono::duration_cast<std::chrono::seconds>(uptime).count()};
    value["services"] = services(job.principal);
    addWanted(value["services"]);
    return jsonResponse(200, value);
}

HttpResponse App::adminLog(const Job& job) {
    std::string error;
    auto query = parseLogQuery(job.request.query(), error);
    if (!query) {
        return problem(400, error + ".", job.id);
    }
    // One entry more than the page holds tells whether there is another page.
    const auto limit = static_cast<std::size_t>(query->limit++);
    auto entries = queryAdminLog(*query, error);
    if (!entries) {
        return problem(500, error, job.id);
    }
    Json::Value value(Json::objectValue);
    value["next"] = Json::Value();
    if (entries->size() > limit) {
        entries->resize(limit);
        value["next"] = Json::Int64{entries->back().id};
    }
    value["entries"] = Json::Value(Json::arrayValue);
    for (const AdminLogEntry& entry : *entries) {
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
        return problem(400, "The body is no JSON object: " + parsed.error + ".", job.id);
    }
    const Json::Value& name = parsed.value["name"];
    const Json::Value& role = parsed.value["role"];
    if (!name.isString() || !isTokenName(name.asString())) {
        return badToken("name", "a text of 1 to 64 bytes without control characters", job.id);
    }
    const auto known = role.isString() ? roleNamed(role.asString()) : std::nullopt;
    if (!known) {
        return badToken("role", "\"admin\" or \"viewer\"", job.id);
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
