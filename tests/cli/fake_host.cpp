#include "tests/cli/fake_host.h"

#include <json/reader.h>
#include <json/writer.h>

#include <memory>
#include <stdexcept>
#include <utility>

namespace {

HttpReply jsonReply(const Json::Value& value) {
    HttpReply reply;
    reply.body = textOf(value);
    return reply;
}

std::string ifMatchOf(const HttpRequest& request) {
    const std::size_t begin = request.head.find("If-Match: ");
    return begin == std::string::npos
               ? ""
               : request.head.substr(begin + 10, request.head.find('\r', begin) - begin - 10);
}

HttpReply noContent() {
    HttpReply reply;
    reply.status = 204;
    return reply;
}

Json::Value storedRules(const Json::Value& rules) {
    Json::Value answer;
    answer["rules"] = Json::Value(Json::arrayValue);
    for (Json::Value rule : rules) {
        rule["path_exist"] = rule["path"] != "/gone";
        answer["rules"].append(rule);
    }
    answer["total"] = answer["rules"].size();
    return answer;
}

} // namespace

HttpReply problemReply(int status, const std::string& problem) {
    HttpReply reply;
    reply.status = status;
    reply.contentType = "application/problem+json";
    reply.body = problem;
    return reply;
}

Json::Value jsonOf(const std::string& text) {
    const std::unique_ptr<Json::CharReader> reader(Json::CharReaderBuilder().newCharReader());
    Json::Value value;
    std::string errors;
    if (!reader->parse(text.data(), text.data() + text.size(), &value, &errors)) {
        throw std::invalid_argument("not JSON: " + text);
    }
    return value;
}

std::string textOf(const Json::Value& value) {
    Json::StreamWriterBuilder builder;
    builder["indentation"] = "";
    return Json::writeString(builder, value);
}

FakeHost::FakeHost()
    : ftp(jsonOf(R"({"enable_ftp": true, "enable_ftps": false, "timeout": 300, "portnum": 21,
                     "custom_port_range": false, "custom_port": "55536:55567", "use_ext_ip": false, "ext_ip": "",
                     "utf8_mode": 1, "enable_fxp": false, "enable_ascii": false, "enable_fips": false,
                     "enable_flow_ctrl": false, "maxuploadrate": 0, "maxdownloadrate": 0, "max_conn_per_ip": 2})")),
      security(jsonOf(R"({"user_chroot": false, "anonymous": false, "anonymous_chroot": false,
                          "anonymous_chroot_share": "", "enable_umask": false})")),
      sftp(jsonOf(R"({"enable": false, "portnum": 22})")) {}

void FakeHost::answerWith(const std::string& request, HttpReply reply) {
    const std::lock_guard lock(*mutex_);
    scripted_[request] = std::move(reply);
}

HttpReply FakeHost::handle(const HttpRequest& request) {
    const std::lock_guard lock(*mutex_);
    return answer(request);
}

HttpReply FakeHost::answer(const HttpRequest& request) {
    const auto scripted = scripted_.find(request.method + " " + request.target);
    if (scripted != scripted_.end()) {
        return scripted->second;
    }
    if (outdated > 0 && request.method == "POST" && !etag.empty()) {
        --outdated;
        conditions.push_back(ifMatchOf(request));
        ftp["enable_ftps"] = true;
        return problemReply(412, R"({"title": "Precondition Failed"})");
    }
    if (request.method != "GET" && request.method != "POST") {
        return problemReply(405, R"({"title": "Method not allowed"})");
    }
    if (request.method == "POST" && !etag.empty()) {
        conditions.push_back(ifMatchOf(request));
    }
    HttpReply reply = callMethod(request.target, request.body.empty() ? Json::Value(Json::objectValue)
                                                                      : jsonOf(request.body));
    reply.etag = etag;
    return reply;
}

HttpReply FakeHost::callMethod(const std::string& row, const Json::Value& parameters) {
    if (row == "/api/status") {
        return jsonReply(status());
    }
    const std::string api = "/api/VELT.Core.FileServ.FTP";
    const std::set<std::string> ftpRequired = {"enable_ftp", "enable_ftps"};
    if (row == api + "/v3/get" || row == api + "/v2/get" || row == api + "/v1/get") {
        return jsonReply(ftp);
    }
    if (row == api + "/v3/set" || row == api + "/v2/set" || row == api + "/v1/set") {
        return set(ftp, parameters, ftpRequired);
    }
    if (row == api + ".Security/v1/get") {
        return jsonReply(security);
    }
    if (row == api + ".Security/v1/set") {
        return set(security, parameters, {});
    }
    if (row == api + ".SFTP/v1/get") {
        return jsonReply(sftp);
    }
    if (row == api + ".SFTP/v1/set") {
        return set(sftp, parameters, {"enable"});
    }
    if (row == api + ".ChrootUser/v2/load") {
        return jsonReply(storedRules(rules));
    }
    if (row == api + ".ChrootUser/v2/save") {
        return saveRules(parameters);
    }
    return problemReply(404, R"({"title": "No such method", "detail": "The server has no such row."})");
}

Json::Value FakeHost::status() const {
    Json::Value answer = jsonOf(R"({"version": "1.0.0", "uptime_seconds": 1})");
    for (const std::string name : {"ftp", "ftps", "sftp"}) {
        Json::Value service;
        service["name"] = name;
        service["enabled"] = name == "sftp" ? sftp["enable"] : ftp["enable_" + name];
        if (tellsWanted) {
            service["wanted"] = down.count(name) != 0 || service["enabled"].asBool();
        }
        answer["services"].append(service);
    }
    return answer;
}

HttpReply FakeHost::set(Json::Value& settings, const Json::Value& parameters,
                        const std::set<std::string>& required) {
    for (const std::string& key : required) {
        if (!parameters[key].isBool()) {
            return problemReply(
                422, R"({"title": "A parameter is missing", "code": 1901, "errors": [{"field": ")" + key +
                         R"(", "expected": "true or false"}]})");
        }
    }
    // The server passes over a range without its switch, and refuses a switch without a range.
    const bool ranged = parameters["custom_port_range"] == true;
    if (ranged && !parameters.isMember("custom_port")) {
        return problemReply(422, R"({"title": "No range", "code": 1901})");
    }
    for (const std::string& key : parameters.getMemberNames()) {
        if (key != "custom_port" || ranged) {
            settings[key] = parameters[key] == " " ? Json::Value("") : parameters[key];
        }
    }
    return noContent();
}

HttpReply FakeHost::saveRules(const Json::Value& parameters) {
    rules = Json::Value(Json::arrayValue);
    for (const Json::Value& rule : parameters["rules"]) {
        if (accounts.count(rule["name"].asString()) != 0) {
            rules.append(rule);
        }
    }
    return noContent();
}
