// For each method of the modules and each field of the document: what the plan says is what happens, as far
// as it can be seen from outside.
#include "tests/host/client.h"
#include "tests/support/waiting.h"
#include "tests/system/support/plan_service.h"

#include <filesystem>
#include <set>
#include <thread>

namespace velt::test {
namespace {

using HostPlan = PlanService;

/// The names of the members that the schema knows, whatever it refers to.
void collectMembers(const Json::Value& document, const Json::Value& schema, std::set<std::string>& names) {
    const std::string reference = schema["$ref"].asString();
    if (!reference.empty()) {
        collectMembers(document,
                       document["components"]["schemas"][reference.substr(reference.rfind('/') + 1)], names);
    }
    for (const Json::Value& each : schema["allOf"]) {
        collectMembers(document, each, names);
    }
    for (const std::string& name : schema["properties"].getMemberNames()) {
        names.insert(name);
    }
}

TEST_F(HostPlan, holdsForEachFieldOfTheDocument) {
    for (const char* body :
         {R"({"ftp": {"enable_ftp": true}})",
          R"({"ftp": {"enable_ftps": true}})",
          R"({"ftp": {"timeout": 400}})",
          R"({"ftp": {"portnum": 2007}})",
          R"({"ftp": {"custom_port_range": true, "custom_port": "3000:3100"}})",
          R"({"ftp": {"custom_port": "3110:3200"}})",
          R"({"ftp": {"use_ext_ip": true, "ext_ip": "192.0.2.7"}})",
          R"({"ftp": {"ext_ip": "192.0.2.8"}})",
          R"({"ftp": {"utf8_mode": 1}})",
          R"({"ftp": {"enable_fxp": true}})",
          R"({"ftp": {"enable_ascii": true}})",
          R"({"ftp": {"enable_flow_ctrl": true}})",
          R"({"ftp": {"maxuploadrate": 7}})",
          R"({"ftp": {"maxdownloadrate": 8}})",
          R"({"ftp": {"max_conn_per_ip": 9}})",
          R"({"ftp": {"enable_fips": true}})",
          R"({"security": {"user_chroot": false}})",
          R"({"security": {"anonymous": true}})",
          R"({"security": {"anonymous_chroot": true, "anonymous_chroot_share": "public"}})",
          R"({"security": {"anonymous_chroot_share": "upload"}})",
          R"({"security": {"enable_umask": false}})",
          R"({"sftp": {"enable": true}})",
          R"({"sftp": {"portnum": 2017}})",
          R"({"confinement": {"sftp": false}})",
          R"({"confinement": {"sftp": true}})",
          R"({"chroot_rules": [{"type": "user", "name": "alice", "path": "/public"}]})",
          R"({"ftp": null, "security": null, "sftp": null, "confinement": null, "chroot_rules": null})"}) {
        expectAsPlanned(body);
    }
    const Json::Value openApi = curl("/openapi.json").json;
    const Json::Value& document = openApi["components"]["schemas"]["SettingsDocument"];
    std::set<std::string> fields;
    for (const std::string& section : document["properties"].getMemberNames()) {
        std::set<std::string> names;
        collectMembers(openApi, document["properties"][section], names);
        for (const std::string& name : names) {
            fields.insert("/" + section + "/" + name);
        }
        if (names.empty()) {
            fields.insert("/" + section);
        }
    }
    // The form of the document is no setting.
    EXPECT_EQ(fields.erase("/format") + fields.erase("/format_version"), 2U);
    EXPECT_EQ(covered, fields);
}

TEST_F(HostPlan, holdsForTheSessionsAndForWhatIsOff) {
    for (const std::string sessions : {"", "sessions=keep", "sessions=end"}) {
        for (const char* body :
             {R"({"ftp": {"enable_ftp": true}, "sftp": {"enable": true}})",
              R"({"security": {"anonymous": true}})", R"({"security": {"anonymous": false}})",
              R"({"sftp": {"portnum": 2019}})",
              R"({"chroot_rules": [{"type": "user", "name": "alice", "path": "/public"}]})",
              R"({"ftp": {"enable_ftp": false}})",
              R"({"ftp": {"timeout": 420, "portnum": 2008}, "chroot_rules": []})",
              R"({"sftp": {"enable": false}})", R"({"ftp": null, "sftp": {"portnum": 2029}})"}) {
            expectAsPlanned(body + (" " + sessions), [&](const std::string& query) {
                const char* const join = query.empty() ? "?" : "&";
                return patch(body, sessions.empty() ? query : query + join + sessions);
            });
        }
    }
}

/// The effects of a plan that concern daemons and their sessions.
std::vector<std::string> fates(const HttpResult& plan) {
    std::vector<std::string> found;
    for (const Json::Value& each : plan.json["effects"]) {
        const std::string subject = each["subject"].asString();
        if (subject == "ftp" || subject == "sftp") {
            found.push_back(each["effect"].asString() + " " + subject);
        }
    }
    return found;
}

TEST_F(HostPlan, namesTheEndOfSessionsAndNothingThatDoesNotRun) {
    using Fates = std::vector<std::string>;
    const std::string ask = "?dry_run=true";
    EXPECT_EQ(fates(patch(R"({"ftp": {"timeout": 410}})", ask)), Fates()) << "nothing runs";
    done({"ftp", "set", "enable_ftp=on"});
    done({"security", "set", "anonymous=on"});
    const std::string less = R"({"security": {"anonymous": false}})";
    const HttpResult handedOver = patch(less, ask);
    EXPECT_EQ(fates(handedOver), (Fates{"hand over ftp"}));
    EXPECT_EQ(handedOver.json["sessions_ended"], 0) << "the former daemon is no session";
    const FtpSession session = aliceAt();
    const HttpResult cutting = patch(less, ask);
    EXPECT_EQ(fates(cutting), (Fates{"hand over ftp", "end sessions ftp"}));
    EXPECT_EQ(cutting.json["sessions_ended"], 1);
    const std::string off = R"({"ftp": {"enable_ftp": false}})";
    EXPECT_EQ(fates(patch(off, ask)), (Fates{"stop ftp"}));
    const HttpResult closing = patch(off, ask + "&sessions=keep");
    EXPECT_EQ(fates(closing), (Fates{"close ftp"}));
    EXPECT_EQ(closing.json["sessions_ended"], 0);
}

TEST_F(HostPlan, holdsForEachMethod) {
    const std::vector<std::pair<std::string, std::string>> writing{
        {"/api/VELT.Core.FileServ.FTP/v3/set",
         R"({"enable_ftp": true, "enable_ftps": false, "timeout": 410})"},
        {"/api/VELT.Core.FileServ.FTP/v2/set",
         R"({"enable_ftp": true, "enable_ftps": true, "use_utf8": false, "portnum": 2007})"},
        {"/api/VELT.Core.FileServ.FTP/v1/set",
         R"({"enable_ftp": true, "enable_ftps": true, "enable_utf8": false, "max_conn_per_ip": 5})"},
        {std::string(securityApi) + "set", R"({"anonymous": true, "enable_umask": false})"},
        {std::string(sftpApi) + "set", R"({"enable": true, "portnum": 2009})"},
        {std::string(usersApi) + "add", R"({"id": ["alice", "bob"]})"},
        {std::string(usersApi) + "delete", R"({"id": ["bob"]})"},
        {std::string(rulesApi) + "save",
         R"({"rules": [{"type": "user", "name": "bob", "path": "/public"}]})"},
        {"/api/VELT.Core.FileServ.FTP/v3/set", R"({"enable_ftp": false, "enable_ftps": false})"},
        {std::string(sftpApi) + "set", R"({"enable": false})"}};
    std::set<std::string> asked;
    for (const auto& each : writing) {
        expectAsPlanned(each.first,
                        [&](const std::string& query) { return curl(each.first + query, each.second); });
        asked.insert(each.first);
    }
    const SystemMoment before = settled();
    const Json::Value rows = curl("/api").json["rows"];
    for (const Json::Value& row : rows) {
        const std::string path = "/api/" + row["api"].asString() + "/v" + row["version"].asString() + "/" +
                                 row["method"].asString();
        if (row["read"].asBool()) {
            const HttpResult answer = curl(path + "?dry_run=true", R"({"chroot": true})");
            EXPECT_EQ(answer.status, 200) << path << "\n" << answer.body;
            asked.insert(path);
        }
        EXPECT_TRUE(asked.contains(path)) << path << " is a method that nobody tried";
    }
    EXPECT_EQ(asked.size(), 16U);
    EXPECT_EQ(differences(before, systemNow()), std::vector<std::string>()) << "after all methods that read";
}

/// The document with its tag, or what comes of sending it.
Answer askForSettings(const std::string& method, const std::string& headers = "",
                      const std::string& body = "") {
    return Client::unixSocket(worldRoot / "run/velt/veltd.sock")
        .ask(requestText(method, "/api/settings", headers, body));
}

TEST_F(HostPlan, whatWasReadAndSentBackChangesNothingAndCutsNobody) {
    furnishSftp();
    done({"ftp", "set", "enable_ftp=on", "enable_ftps=on", "use_ext_ip=on", "ext_ip=192.0.2.7"});
    done({"sftp", "set", "enable=on"});
    done({"chroot", "rules", "add", "user", "bob", "/public"});
    FtpSession session = aliceAt();
    ProcessResult download;
    std::thread client([&download] { download = sftp(2222, "get large /mnt/got\n", "2000"); });
    EXPECT_TRUE(waitUntil([] { return std::filesystem::exists("/mnt/got"); }, patience));
    const SystemMoment before = settled();
    const Answer read = askForSettings("GET");
    EXPECT_EQ(read.status, 200);
    const std::string tag = read.header("etag");
    EXPECT_NE(tag, "");
    for (const char* method : {"PUT", "PATCH"}) {
        const Answer sent = askForSettings(method, "If-Match: " + tag + "\r\n", read.body);
        EXPECT_EQ(sent.status, 200) << sent.body;
        EXPECT_TRUE(sent.json()["changes"].empty() && sent.json()["effects"].empty()) << sent.body;
        EXPECT_EQ(sent.header("etag"), tag);
    }
    EXPECT_EQ(done({"import", "-"}, exported()), "Nothing changed.\n");
    EXPECT_EQ(askForSettings("GET").header("etag"), tag);
    EXPECT_EQ(differences(before, systemNow()), std::vector<std::string>());
    EXPECT_EQ(session.command("NOOP").code, 200);
    client.join();
    EXPECT_EQ(download.exitCode, 0) << download.errors;
    EXPECT_EQ(std::filesystem::file_size("/mnt/got"), largeSize);
    std::filesystem::remove("/mnt/got");
}

TEST_F(HostPlan, aRecordThatCannotBeWrittenIsSaid) {
    done({"ftp", "set", "enable_ftp=on"});
    const std::filesystem::path database = worldRoot / "var/lib/velt/log.db";
    const std::filesystem::path aside = "/mnt/log.db";
    std::filesystem::copy_file(database, aside);
    std::filesystem::remove(database);
    std::filesystem::create_directory(database);
    const HttpResult changed = patch(R"({"ftp": {"portnum": 2007}})");
    EXPECT_EQ(changed.status, 200) << changed.body;
    EXPECT_EQ(changed.json["warnings"].size(), 3U)
        << "the module's entry, the host's, the history: " << changed.body;
    EXPECT_EQ(
        curl(std::string(ftpApi) + "set", R"({"enable_ftp": true, "enable_ftps": false, "timeout": 410})")
            .status,
        200)
        << "204 would say that all is well";
    const HttpResult waiting = patch(R"({"ftp": {"portnum": 2008}})", "?confirm_within=60");
    EXPECT_EQ(waiting.status, 500) << "nobody could take it back";
    EXPECT_EQ(fetchHome(2007), "alice");
    std::filesystem::remove(database);
    std::filesystem::rename(aside, database);
    EXPECT_EQ(patch(R"({"ftp": {"portnum": 2009}})").json["warnings"].size(), 0U);
}

} // namespace
} // namespace velt::test
