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

Json::Value storedRules(const Json::Value& rules) {
    Json::Value answer;
    answer["rules"] = Json::Value(Json::arrayValue);
    for (Json::Value rule : rules) {
        if (rule["name"].asString().starts_with('#')) {
            continue; // the module names accounts
        }
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
      confinement(jsonOf(R"({"sftp": false})")), sftp(jsonOf(R"({"enable": false, "portnum": 22})")) {}

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
    const bool changes = request.method == "POST" || request.method == "PATCH";
    if (outdated > 0 && changes && !etag.empty()) {
        --outdated;
        conditions.push_back(ifMatchOf(request));
        rules.append(jsonOf(R"({"type": "user", "name": "ben", "path": "/docs"})"));
        return problemReply(412, R"({"title": "Precondition Failed"})");
    }
    if (request.method != "GET" && !changes) {
        return problemReply(405, R"({"title": "Method not allowed"})");
    }
    if (changes && !etag.empty()) {
        conditions.push_back(ifMatchOf(request));
    }
    const Json::Value body = request.body.empty() ? Json::Value(Json::objectValue) : jsonOf(request.body);
    HttpReply reply = request.method == "PATCH" ? patch(request.target, body) : callMethod(request.target);
    reply.etag = etag;
    return reply;
}

HttpReply FakeHost::callMethod(const std::string& row) {
    if (row == "/api/settings") {
        return jsonReply(document());
    }
    const std::string api = "/api/VELT.Core.FileServ.FTP";
    if (row == api + "/v3/get" || row == api + "/v2/get" || row == api + "/v1/get") {
        return jsonReply(ftp);
    }
    if (row == api + ".Security/v1/get") {
        return jsonReply(security);
    }
    if (row == api + ".SFTP/v1/get") {
        return jsonReply(sftp);
    }
    if (row == api + ".ChrootUser/v2/load") {
        return jsonReply(storedRules(rules));
    }
    return problemReply(404, R"({"title": "No such method", "detail": "The server has no such row."})");
}

Json::Value FakeHost::document() const {
    Json::Value whole = jsonOf(R"({"format": "velt-settings", "format_version": 1})");
    whole["ftp"] = ftp;
    whole["security"] = security;
    whole["confinement"] = confinement;
    whole["sftp"] = sftp;
    whole["chroot_rules"] = rules;
    return whole;
}

HttpReply FakeHost::patch(const std::string& target, const Json::Value& patch) {
    Json::Value answer = report;
    answer["dry_run"] = target.find("dry_run=true") != std::string::npos;
    answer["changes"] = Json::Value(Json::arrayValue);
    const auto put = [&](const std::string& field, Json::Value& place, const Json::Value& value) {
        if (place == value) {
            return;
        }
        Json::Value change;
        change["field"] = field;
        change["from"] = place;
        change["to"] = value;
        answer["changes"].append(change);
        if (answer["dry_run"] == false) {
            place = value;
        }
    };
    for (const Json::Value& rule : patch["chroot_rules"]) {
        const std::string name = rule["name"].asString();
        if (accounts.count(name) == 0 && !name.starts_with('#')) {
            return problemReply(
                422, R"({"detail": "/chroot_rules: expected a user that exists.", "changed": false})");
        }
    }
    if (patch.isMember("chroot_rules")) {
        put("/chroot_rules", rules, patch["chroot_rules"]);
    }
    for (auto& [name, section] : std::map<std::string, Json::Value*>{
             {"ftp", &ftp}, {"security", &security}, {"confinement", &confinement}, {"sftp", &sftp}}) {
        for (const std::string& key :
             patch[name].isObject() ? patch[name].getMemberNames() : std::vector<std::string>{}) {
            put("/" + name + "/" + key, (*section)[key], patch[name][key]);
        }
    }
    return jsonReply(answer);
}
