// What is refused or fails: which field or port, what was wrong, and that nothing was changed.
#include "tests/support/text.h"
#include "tests/system/support/host_service.h"

namespace velt::test {
namespace {

/// A method, a request that it takes, and values that each of its fields does not take.
struct MethodCase {
    std::string path;
    std::string good;
    std::vector<std::pair<std::string, std::vector<std::string>>> wrong;
};

const std::vector<std::string> noBool{"null", "1", "\"on\"", "[]", "{}", "0.5"};
const std::vector<std::string> noOptionalBool{"1", "\"true\"", "[true]", "{}"};
const std::vector<std::string> noInteger{"true", "\"21\"", "1.5", "[1]", "{}", "2147483648"};
const std::vector<std::string> noText{"true", "5", "[\"a\"]", "{}"};
const std::vector<std::string> noFilledText{"\"\"", "true", "5", "[\"a\"]", "{}"};

MethodCase ftpSet(int version, const std::string& utf8Key, const std::vector<std::string>& noUtf8) {
    return {"/api/VELT.Core.FileServ.FTP/v" + std::to_string(version) + "/set",
            R"({"enable_ftp": false, "enable_ftps": false})",
            {{"enable_ftp", noBool},
             {"enable_ftps", noBool},
             {"timeout", noInteger},
             {"portnum", noInteger},
             {"custom_port_range", noOptionalBool},
             {"custom_port", noFilledText},
             {"use_ext_ip", noOptionalBool},
             {"ext_ip", noFilledText},
             {"enable_fxp", noOptionalBool},
             {"enable_fips", noOptionalBool},
             {"enable_ascii", noOptionalBool},
             {"enable_flow_ctrl", noOptionalBool},
             {"maxuploadrate", noInteger},
             {"maxdownloadrate", noInteger},
             {"max_conn_per_ip", noInteger},
             {utf8Key, noUtf8}}};
}

const std::vector<MethodCase> methods{
    ftpSet(1, "enable_utf8", noOptionalBool),
    ftpSet(2, "use_utf8", noOptionalBool),
    ftpSet(3, "utf8_mode", {"3", "-1", "true", "\"2\"", "1.5"}),
    {"/api/VELT.Core.FileServ.FTP.Security/v1/set",
     "{}",
     {{"user_chroot", noOptionalBool},
      {"anonymous", noOptionalBool},
      {"anonymous_chroot", noOptionalBool},
      {"anonymous_chroot_share", noText},
      {"enable_umask", noOptionalBool}}},
    {"/api/VELT.Core.FileServ.FTP.SFTP/v1/set",
     R"({"enable": false})",
     {{"enable", noBool}, {"portnum", {"0", "-1", "65536", "true", "\"22\"", "1.5", "[]"}}}},
    {"/api/VELT.Core.FileServ.FTP.ChrootUser/v1/list",
     R"({"chroot": true})",
     {{"chroot", noBool},
      {"offset", noInteger},
      {"limit", noInteger},
      {"type", noText},
      {"domain_name", noText},
      {"substr", noText}}},
    {"/api/VELT.Core.FileServ.FTP.ChrootUser/v1/add",
     R"({"id": ["alice"]})",
     {{"id", {"null", "[]", "\"alice\"", "5", "{}"}}}},
    {"/api/VELT.Core.FileServ.FTP.ChrootUser/v1/delete",
     R"({"id": ["alice"]})",
     {{"id", {"null", "[]", "\"alice\"", "5", "{}"}}}},
};

class HostRefusal : public HostService {
protected:
    void expectFieldRefused(const MethodCase& method, const std::string& field,
                            const std::string& value) const {
        const testing::ScopedTrace trace(__FILE__, __LINE__, method.path + " " + field + " " + value);
        Json::Value body = jsonOf(method.good);
        body[field] = jsonOf(value);
        const HttpResult answer = curl(method.path, textOf(body));
        EXPECT_EQ(answer.status, 422) << answer.body;
        EXPECT_EQ(answer.json["code"], 1901);
        EXPECT_EQ(answer.json["errors"].size(), 1U) << answer.body;
        EXPECT_EQ(answer.json["errors"][0]["field"], field);
        EXPECT_NE(answer.json["errors"][0]["expected"].asString(), "");
        const bool reads = method.path.ends_with("/list");
        EXPECT_EQ(contains(answer.json["detail"].asString(), "Nothing was changed."), !reads) << answer.body;
    }

    /// veltctl fails with the code, its words hold the text, and nothing was changed.
    static void expectFailure(const Words& words, int code, const std::string& text) {
        const testing::ScopedTrace trace(__FILE__, __LINE__, testing::PrintToString(words));
        const std::string before = exported();
        const ProcessResult result = veltctl(words);
        EXPECT_EQ(result.exitCode, code) << result.errors;
        EXPECT_EQ(result.output, "");
        EXPECT_TRUE(contains(result.errors, text)) << result.errors;
        EXPECT_TRUE(contains(result.errors, "What to do: ")) << result.errors;
        EXPECT_EQ(exported(), before);
    }
};

TEST_F(HostRefusal, everyFieldOfEveryMethodIsNamedAndNothingIsChanged) {
    const std::string before = exported();
    const std::string users = done({"chroot", "users", "list"});
    for (const MethodCase& method : methods) {
        for (const auto& [field, values] : method.wrong) {
            for (const std::string& value : values) {
                expectFieldRefused(method, field, value);
            }
        }
    }
    EXPECT_EQ(exported(), before);
    EXPECT_EQ(done({"chroot", "users", "list"}), users);
    EXPECT_EQ(done({"log", "--actor", "curl"}), "ID  TIME  EVENT  ACTOR  ADDRESS  TEXT\n");
}

TEST_F(HostRefusal, severalWrongFieldsAreAllNamed) {
    const HttpResult answer =
        curl(ftpApi + std::string("set"), R"({"enable_ftp": 1, "timeout": "5", "ext_ip": ""})");
    std::string fields;
    for (const Json::Value& error : answer.json["errors"]) {
        fields += error["field"].asString() + " ";
    }
    for (const char* field : {"enable_ftp ", "enable_ftps ", "timeout ", "ext_ip "}) {
        EXPECT_TRUE(contains(fields, field)) << fields;
    }
}

TEST_F(HostRefusal, aWordThatIsNoValueAsksNothing) {
    for (const Words& words : {Words{"ftp", "set", "portnum=abc"}, Words{"ftp", "set", "enable_fxp=1"},
                               Words{"ftp", "set", "utf8_mode=9"}, Words{"sftp", "set", "portnum=70000"},
                               Words{"sftp", "set", "port=1"}, Words{"security", "set", "anonymous"}}) {
        expectFailure(words, 2, "veltctl: ");
    }
}

TEST_F(HostRefusal, aRefusedValueIsExplained) {
    expectFailure({"call", "VELT.Core.FileServ.FTP", "3", "set",
                   R"({"enable_ftp": true, "enable_ftps": false, "utf8_mode": 9})"},
                  3, "utf8_mode: expected a number from 0 to 2");
    expectFailure(
        {"call", "VELT.Core.FileServ.FTP.SFTP", "1", "set", R"({"enable": true, "portnum": 70000})"}, 3,
        "portnum: expected a number from 1 to 65535");
    expectFailure({"call", "VELT.Core.FileServ.FTP", "3", "set", R"({"enable_ftp": "yes"})"}, 3,
                  "enable_ftp: expected true or false");
    expectFailure({"call", "VELT.Core.FileServ.FTP", "4", "set"}, 3, "There is nothing");
    expectFailure({"chroot", "rules", "add", "user", "nobody-like-this", "/home"}, 3,
                  "/chroot_rules/0/name: expected a user that exists, not nobody-like-this");
    expectFailure({"chroot", "rules", "add", "user", "alice", "/a/../b"}, 3,
                  "/chroot_rules/0/path: expected a folder like /home or /SHARE/FOLDER, not /a/../b");
    expectFailure({"chroot", "rules", "remove", "user", "alice"}, 3, "no rule for the user alice");
    expectFailure({"tokens", "delete", "absent"}, 3, "absent");
}

TEST_F(HostRefusal, whatTheServicesCannotTakeIsSaidInTheirWords) {
    done({"ftp", "set", "enable_ftp=on"});
    expectFailure({"ftp", "set", "ext_ip=eth0"}, 3, "/ftp/ext_ip: expected an IPv4 address");
    const Words negative{"call", "VELT.Core.FileServ.FTP", "3", "set",
                         R"({"enable_ftp": true, "enable_ftps": false, "timeout": -5})"};
    expectFailure(negative, 3, "The FTP setting timeout is -5; expected a number from 0 to");
    expectFailure(negative, 3, "Nothing was changed.");
    expectFailure({"ftp", "set", "custom_port=30000:30000"}, 3,
                  "/ftp/custom_port: expected first and last port");
    expectFailure({"security", "set", "anonymous_chroot=on"}, 3,
                  "/security/anonymous_chroot_share: expected the name of a share");
    expectFailure({"chroot", "users", "add", "nobody-like-this"}, 3, "nobody-like-this");
    EXPECT_EQ(fetchHome(), "alice");
}

TEST_F(HostRefusal, aTakenPortNamesItsHolder) {
    done({"ftp", "set", "enable_ftp=on"});
    const UniqueFd other = listenOn(2300);
    const std::string holder = "system-host-tes (process 1)"; // as much of a name as the kernel keeps
    expectFailure({"ftp", "set", "portnum=2300"}, 4, "taken by " + holder);
    expectFailure({"sftp", "set", "portnum=2300"}, 4, holder);
    expectFailure({"ftp", "set", "custom_port=2290:2310"}, 4, holder);
    expectFailure({"ftp", "set", "portnum=2222"}, 4, "taken by the SFTP service");
    expectFailure({"sftp", "set", "portnum=2121"}, 4, "FTP");
    const std::string before = exported();
    const std::vector<std::tuple<std::string, std::string, int>> requests{
        {ftpApi, R"({"enable_ftp": true, "enable_ftps": false, "portnum": 2300})", 1903},
        {ftpApi,
         R"({"enable_ftp": true, "enable_ftps": false, "custom_port_range": true, "custom_port": "2290:2310"})",
         1904},
        {sftpApi, R"({"enable": true, "portnum": 2300})", 1951}};
    for (const auto& [path, body, code] : requests) {
        const HttpResult answer = curl(path + "set", body);
        EXPECT_EQ(answer.status, 409) << answer.body;
        EXPECT_EQ(answer.json["code"], code);
        EXPECT_EQ(answer.json["holder"].asString(), holder);
        EXPECT_TRUE(contains(answer.json["detail"].asString(), "2300")) << answer.body;
    }
    EXPECT_EQ(exported(), before);
    EXPECT_EQ(fetchHome(), "alice");
}

TEST_F(HostRefusal, aShareOutOfReachIsAConflict) {
    expectFailure({"security", "set", "anonymous_chroot=on", "anonymous_chroot_share=closed"}, 4,
                  "veltctl shares");
    expectFailure({"security", "set", "anonymous_chroot=on", "anonymous_chroot_share=absent"}, 4,
                  "not accessible");
}

TEST_F(HostRefusal, aDaemonThatDoesNotTakeItsCertificateIsQuoted) {
    done({"ftp", "set", "enable_ftp=on"});
    const auto folder = worldRoot / "etc/velt/tls";
    std::filesystem::create_directories(folder);
    writeFile(folder / "server.crt", "no certificate\n");
    writeFile(folder / "server.key", "no key\n");
    expectFailure({"ftp", "set", "enable_ftps=on"}, 4, "server.crt");
    EXPECT_EQ(fetchHome(), "alice") << "the service goes on with its former settings";
    std::filesystem::remove_all(folder);
}

TEST_F(HostRefusal, noConnectionAndNoAccess) {
    const ProcessResult absent = runProcess({"/mnt/veltctl", "--socket", "/mnt/absent.sock", "status"});
    EXPECT_EQ(absent.exitCode, 6);
    EXPECT_TRUE(contains(absent.errors, "Start veltd")) << absent.errors;
    const ProcessResult alice = veltctlAs(aliceId, {"status"});
    EXPECT_EQ(alice.exitCode, 6);
    EXPECT_TRUE(contains(alice.errors, "velt-admin")) << alice.errors;
    EXPECT_EQ(veltctlWith("0123456789abcdef", {"ftp", "get"}).exitCode, 6);
    const std::string viewer = makeToken("looker", "viewer");
    EXPECT_EQ(veltctlWith(viewer, {"ftp", "get"}).exitCode, 0);
    const ProcessResult refused = veltctlWith(viewer, {"ftp", "set", "timeout=5"});
    EXPECT_EQ(refused.exitCode, 6);
    EXPECT_TRUE(contains(refused.errors, "this one can only read")) << refused.errors;
    EXPECT_EQ(veltctlWith(viewer, {"tokens", "list"}).exitCode, 6);
    EXPECT_EQ(jsonOf(exported())["ftp"]["timeout"], 300);
}

} // namespace
} // namespace velt::test
