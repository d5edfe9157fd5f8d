// Requests that reach the module, over the fake platform.

#include "base/utf8.h"
#include "tests/host/fake_standalone.h"
#include "tests/host/host_test.h"
#include "tests/support/fake_platform/fake_platform.h"

namespace {

const std::string ftp = "/api/VELT.Core.FileServ.FTP/v";
const std::string security = "/api/VELT.Core.FileServ.FTP.Security/v1/";
const std::string chroot = "/api/VELT.Core.FileServ.FTP.ChrootUser/v";
const std::string sftp = "/api/VELT.Core.FileServ.FTP.SFTP/v1/";

class HostRows : public HostTest {
protected:
    void SetUp() override {
        platform.reset();
        FakeStandalone::instance() = {};
        settings.workers = 1; // the fake platform knows one thread
        start();
    }

    fake::Platform& platform = fake::Platform::instance();
    FakeStandalone& access = FakeStandalone::instance();
};

TEST_F(HostRows, AReadAnswersItsValue) {
    platform.timeout = 77;
    const Answer answer = post(ftp + "3/get");
    EXPECT_EQ(answer.status, 200);
    EXPECT_EQ(answer.header("content-type"), "application/json");
    EXPECT_EQ(answer.json()["timeout"], 77);
}

TEST_F(HostRows, AReadWithoutParametersMayBeAGet) {
    for (const std::string& target : {ftp + "1/get", ftp + "2/get", ftp + "3/get", security + "get",
                                      security + "list_ftp_share", chroot + "2/load", sftp + "get"}) {
        EXPECT_EQ(get(target).status, 200) << target;
        EXPECT_EQ(get(target).body, post(target, "{}").body) << target;
    }
}

TEST_F(HostRows, AWriteAnswersWithoutContentAndIsDone) {
    const Answer answer = post(sftp + "set", R"({"enable":true,"portnum":2222})");
    EXPECT_EQ(answer.status, 204);
    EXPECT_EQ(answer.body, "");
    EXPECT_EQ(answer.header("content-length"), "");
    EXPECT_EQ(platform.sftp.port, 2222);
}

TEST_F(HostRows, ARefusedParameterIsExplained) {
    const Answer answer = post(sftp + "set", R"({"enable":true,"portnum":70000})");
    EXPECT_EQ(answer.status, 422);
    EXPECT_EQ(answer.header("content-type"), "application/problem+json");
    const Json::Value problem = answer.json();
    EXPECT_EQ(problem["code"], 1901);
    EXPECT_EQ(problem["status"], 422);
    EXPECT_EQ(problem["title"], "A parameter is invalid");
    EXPECT_EQ(problem["request_id"], answer.header("x-request-id"));
    ASSERT_EQ(problem["errors"].size(), 1U);
    EXPECT_EQ(problem["errors"][0]["field"], "portnum");
    EXPECT_EQ(problem["errors"][0]["expected"], "a number from 1 to 65535");
    EXPECT_EQ(problem["detail"], "Invalid port value of input. portnum: expected a number from 1 to 65535. "
                                 "Nothing was changed.");
}

TEST_F(HostRows, ATextThatWouldBeCutOnTheWayIsRefused) {
    const auto expectRefusal = [&](const std::string& target, const std::string& body,
                                   const std::string& field, const std::string& expected) {
        const Answer answer = post(target, body);
        EXPECT_EQ(answer.status, 422) << body;
        const Json::Value problem = answer.json();
        EXPECT_EQ(problem["errors"].size(), 1U) << body;
        EXPECT_EQ(problem["errors"][0]["field"], field) << body;
        EXPECT_EQ(problem["errors"][0]["expected"], expected) << body;
        EXPECT_EQ(problem["detail"], field + ": expected " + expected + ". Nothing was changed.");
        EXPECT_FALSE(problem.isMember("code")) << "the module was not asked";
    };
    const std::string noNul = "a text without the character U+0000";
    expectRefusal(ftp + "3/set", R"({"enable_ftp":true,"enable_ftps":false,"ext_ip":"192.0.2.1\u0000x"})",
                  "ext_ip", noNul);
    expectRefusal(chroot + "1/add", R"({"id":["alice","bob\u0000"]})", "id[1]", noNul);
    expectRefusal(chroot + "1/list", R"({"substr":"\u0000"})", "substr", noNul);
    expectRefusal(chroot + "2/save", R"({"rules":[{"type":"user","name":"a","path":"/x\u0000"}]})",
                  "rules[0].path", noNul);
    const std::string oneLine = "a text without control characters";
    expectRefusal(ftp + "3/set", R"({"custom_port_range":true,"custom_port":"50000:50100\njunk"})",
                  "custom_port", oneLine);
    expectRefusal(ftp + "1/set", R"({"ext_ip":"192.0.2.1\u001b"})", "ext_ip", oneLine);
    expectRefusal(security + "set", R"({"anonymous_chroot_share":"a\u007f"})", "anonymous_chroot_share",
                  oneLine);
    EXPECT_EQ(platform.journal.size(), 0U);
    EXPECT_NE(post(chroot + "1/add", R"({"id":["two\nlines"]})").status, 422) << "what the module decides";
}

TEST_F(HostRows, AMissingParameterIsNamed) {
    const Json::Value problem = post(ftp + "3/set", R"({"enable_ftp":true})").json();
    ASSERT_EQ(problem["errors"].size(), 1U);
    EXPECT_EQ(problem["errors"][0]["field"], "enable_ftps");
    EXPECT_EQ(problem["errors"][0]["expected"], "true or false");
}

TEST_F(HostRows, EveryWrongFieldIsNamed) {
    const Json::Value problem =
        post(ftp + "3/set", R"({"enable_ftp":1,"enable_ftps":true,"timeout":"5","utf8_mode":7})").json();
    std::map<std::string, std::string> errors;
    for (const Json::Value& each : problem["errors"]) {
        errors[each["field"].asString()] = each["expected"].asString();
    }
    const std::map<std::string, std::string> expected{{"enable_ftp", "true or false"},
                                                      {"timeout", "a number: 0 to 86400"},
                                                      {"utf8_mode", "a number from 0 to 2"}};
    EXPECT_EQ(errors, expected);
}

TEST_F(HostRows, ARangeWithoutItsPortsIsExplained) {
    const Json::Value problem =
        post(ftp + "3/set", R"({"enable_ftp":true,"enable_ftps":true,"custom_port_range":true})").json();
    ASSERT_EQ(problem["errors"].size(), 1U) << problem.toStyledString();
    EXPECT_EQ(problem["errors"][0]["field"], "custom_port");
}

TEST_F(HostRows, AConflictNamesTheHolderOfThePort) {
    platform.takenPorts["ssh"] = {2121, 40000};
    platform.takenPorts["ftp"] = {2222};
    struct Conflict {
        std::string target;
        const char* body;
        int port;
        int code;
        const char* title;
    };
    const std::string range =
        R"({"enable_ftp":true,"enable_ftps":true,"custom_port_range":true,"custom_port":"39999:40001"})";
    for (const Conflict& each : std::vector<Conflict>{
             {ftp + "3/set", R"({"enable_ftp":true,"enable_ftps":true,"portnum":2121})", 2121, 1903,
              "The FTP port is taken"},
             {ftp + "3/set", range.c_str(), 40000, 1904, "The passive port range is taken"},
             {sftp + "set", R"({"enable":true,"portnum":2222})", 2222, 1951, "The SFTP port is taken"}}) {
        const std::string sentence =
            "Port " + std::to_string(each.port) + " is taken by nginx (process 812).";
        access.conflict = {each.port, "nginx (process 812)", sentence};
        const Answer answer = post(each.target, each.body);
        EXPECT_EQ(answer.status, 409);
        const Json::Value problem = answer.json();
        EXPECT_EQ(problem["code"], each.code);
        EXPECT_EQ(problem["title"], each.title);
        EXPECT_EQ(problem["holder"], "nginx (process 812)");
        EXPECT_EQ(problem["detail"], sentence + " Nothing was changed.");
    }
}

TEST_F(HostRows, APortThatNobodyHoldsIsNone) {
    platform.takenPorts["ssh"] = {0};
    access.sentence = "Port 0: expected a port from 1 to 65535.";
    const Answer answer = post(ftp + "3/set", R"({"enable_ftp":true,"enable_ftps":true,"portnum":0})");
    EXPECT_EQ(answer.status, 422);
    EXPECT_EQ(answer.json()["errors"][0]["field"], "portnum");
    EXPECT_FALSE(answer.json().isMember("holder"));
    EXPECT_EQ(answer.json()["detail"], "portnum: expected a port from 1 to 65535. Nothing was changed.");
    const Answer range =
        post(ftp + "3/set",
             R"({"enable_ftp":true,"enable_ftps":true,"custom_port_range":true,"custom_port":"0:5"})");
    EXPECT_EQ(range.json()["detail"],
              "custom_port: expected first and last port from 1024 to 65535, such as 55536:55899. "
              "Nothing was changed.");
}

TEST_F(HostRows, APortThatCannotBeJudgedIsNotCalledABadOne) {
    platform.takenPorts["ssh"] = {2191};
    access.sentence =
        "Cannot read known_services.conf, line 2: expected a port or a range of ports, and a name.";
    access.error = velt::ErrorNumber::damaged;
    const Answer answer = post(ftp + "3/set", R"({"enable_ftp":true,"enable_ftps":true,"portnum":2191})");
    EXPECT_EQ(answer.status, 500);
    EXPECT_EQ(answer.json()["title"], "The operation failed");
    EXPECT_FALSE(answer.json().isMember("errors"));
    EXPECT_FALSE(answer.json().isMember("holder"));
    EXPECT_EQ(answer.json()["detail"], access.sentence + " Nothing was changed.");
}

TEST_F(HostRows, AShareOutOfReachIsAConflict) {
    access.conflict.holder = "what an earlier request of the thread found";
    const Answer answer = post(security + "set", R"({"anonymous_chroot":true,"anonymous_chroot_share":"x"})");
    EXPECT_EQ(answer.status, 409);
    EXPECT_EQ(answer.json()["code"], 1905);
    EXPECT_FALSE(answer.json().isMember("holder"));
}

TEST_F(HostRows, AFailedOperationTellsThePlatformsSentence) {
    platform.fail("VELTSFTPConfigGet");
    access.sentence = "The file sftp.conf cannot be read: Permission denied.";
    const Answer answer = get(sftp + "get");
    EXPECT_EQ(answer.status, 500);
    EXPECT_EQ(answer.json()["code"], 1902);
    EXPECT_EQ(answer.json()["detail"],
              "Failed to get SFTP config. The file sftp.conf cannot be read: Permission denied.");
}

TEST_F(HostRows, PlacesInThePlatformsSourcesAreForTheLog) {
    platform.fail("VELTFTPChrootRuleEnum");
    access.sentence = "Cannot read chroot_rules, line 1.";
    const Answer answer = get("/api/VELT.Core.FileServ.FTP.ChrootUser/v2/load");
    EXPECT_EQ(answer.json()["detail"], access.sentence);
    EXPECT_TRUE(logged("module: chroot:"));
}

TEST_F(HostRows, TheModulesLinesAreInTheHostsLogUnderTheRequestsId) {
    const Answer answer = post(sftp + "set", R"({"enable":"yes"})");
    const std::string id = "request=" + answer.header("x-request-id") + " ";
    EXPECT_TRUE(logged(id + "module: sftp:"));
    EXPECT_TRUE(logged("bool variable 'enable' is missing."));
    EXPECT_TRUE(logged(R"(Request: {"enable":"yes"})"));
    EXPECT_TRUE(logged(id + "VELT.Core.FileServ.FTP.SFTP v1 set for admin at 127.0.0.1: 422"));
}

TEST_F(HostRows, TheActorAndTheAddressReachThePlatform) {
    get(sftp + "get");
    EXPECT_EQ(access.actor, "admin");
    EXPECT_EQ(access.address, "127.0.0.1");
}

TEST_F(HostRows, AnExceptionIsAnAnswerAndTheProcessLivesOn) {
    platform.throwFrom("VELTFTPConfGet");
    const Answer broken = get(ftp + "3/get");
    EXPECT_EQ(broken.status, 500);
    EXPECT_FALSE(broken.json().isMember("code"));
    EXPECT_NE(broken.json()["detail"].asString().find("threw an exception"), std::string::npos);
    EXPECT_FALSE(broken.json()["request_id"].asString().empty());
    EXPECT_TRUE(logged("request=" + broken.json()["request_id"].asString() + " defect of the module"));
    EXPECT_EQ(get(ftp + "3/get").status, 200);
}

TEST_F(HostRows, ARuleThatIsNoObjectIsNamed) {
    const Answer answer = post(chroot + "2/save", R"({"rules":[{},1]})");
    EXPECT_EQ(answer.status, 422);
    EXPECT_EQ(answer.json()["errors"][0]["field"], "rules[1]");
    EXPECT_EQ(post(chroot + "2/save", R"({"rules":[]})").status, 204);
}

TEST_F(HostRows, UnknownRowsAndPathsAreNotFound) {
    for (const std::string& target :
         {ftp + "4/get", ftp + "3/put", std::string("/api/VELT.None/v1/get"), std::string("/"),
          std::string("/api/"), ftp + "03/get", ftp + "3/get/", std::string("/api/v1/get"),
          ftp + "99999999999999999999/get", std::string("/apis")}) {
        EXPECT_EQ(post(target).status, 404) << target;
    }
}

TEST_F(HostRows, PathsAreDecodedSegmentBySegment) {
    EXPECT_EQ(get("/%68ealthz").status, 200);
    EXPECT_EQ(get("/api/VELT%2ECore%2eFileServ.FTP.SFTP/v1/ge%74?unused=%zz").status, 200);
    EXPECT_EQ(post("/%65vents").header("allow"), "GET");
    for (const char* target : {"/%", "/%4", "/%zz", "/api/%G0", "/%ff", "/healthz%c3"}) {
        EXPECT_EQ(get(target).status, 400) << target;
    }
    for (const char* target :
         {"//healthz", "/healthz/", "/./healthz", "/x/../healthz", "/healthz%2F", "/api%2Fstatus",
          "/healthz;x", "/healthz#x", "/HEALTHZ", "/healthz%00", "/healthz%20", "/api/status/", "/*"}) {
        EXPECT_EQ(get(target).status, 404) << target;
    }
}

TEST_F(HostRows, AnAnswerIsUtf8WhateverTheRequestIs) {
    const Answer path = get("/caf\xE9");
    EXPECT_EQ(path.status, 400);
    EXPECT_EQ(velt::findInvalidUtf8(path.body), std::string::npos) << path.body;
    Client client = connect();
    const Answer host = client.ask("GET /healthz HTTP/1.1\r\nHost: caf\xE9\r\n" + admin + "\r\n");
    EXPECT_EQ(host.status, 403);
    EXPECT_NE(host.json()["detail"].asString().find("\"caf\xEF\xBF\xBD\""), std::string::npos) << host.body;
}

TEST_F(HostRows, ANameThatIsNoUtf8IsShownAsFarAsItCan) {
    platform.shares["\xC3\x9C\xFF"] = {"", "/", 1};
    platform.ftpShares = {"\xC3\x9C\xFF"};
    EXPECT_EQ(get(security + "list_ftp_share").body, "{\"share\":[\"\xC3\x9C\xEF\xBF\xBD\"]}");
}

TEST_F(HostRows, AWrongMethodIsToldTheRightOnes) {
    const Answer write = get(sftp + "set");
    EXPECT_EQ(write.status, 405);
    EXPECT_EQ(write.header("allow"), "POST");
    const Answer listing = get(chroot + "1/list");
    EXPECT_EQ(listing.status, 405);
    EXPECT_EQ(listing.header("allow"), "POST");
    const Answer read = ask("PUT", sftp + "get", admin);
    EXPECT_EQ(read.status, 405);
    EXPECT_EQ(read.header("allow"), "GET, POST");
    EXPECT_EQ(post("/healthz").header("allow"), "GET");
    EXPECT_EQ(ask("DELETE", "/api/tokens", admin).header("allow"), "GET, POST");
    EXPECT_EQ(ask("GET", "/api/tokens/1", admin).header("allow"), "DELETE");
    EXPECT_EQ(post("/events").header("allow"), "GET");
}

TEST_F(HostRows, ABodyThatIsNoJsonObjectIsRefusedWithThePosition) {
    const std::map<std::string, std::string> wrong{
        {"{\"enable\": tru}", "line 1, column 12"},
        {"{\n \"enable\": true,\n \"enable\": false}", "line 3, column 2"},
        {"[1]", "line 1, column 1: expected a JSON object"},
        {"  7", "line 1, column 3: expected a JSON object"},
        {"{} x", "line 1, column 4"},
        {"{\"a\": \"\xC3\x28\"}", "line 1, column 8: the text is not UTF-8"},
        {std::string(100, '[') + std::string(100, ']'), "nested"},
    };
    for (const auto& [body, position] : wrong) {
        const Answer answer = post(sftp + "set", body);
        EXPECT_EQ(answer.status, 400) << body;
        EXPECT_NE(answer.json()["detail"].asString().find(position), std::string::npos)
            << body << " " << answer.body;
    }
    EXPECT_EQ(platform.count("VELTSFTPConfigSet"), 0);
}

TEST_F(HostRows, AnEmptyBodyIsNoParameters) {
    EXPECT_EQ(post(security + "set", "").status, 204);
    EXPECT_EQ(post(security + "set", "  ").status, 204);
}

TEST_F(HostRows, TextsPassAsUtf8) {
    platform.shares["Übung"] = {"", "/", 1};
    platform.ftpShares = {"Übung"};
    EXPECT_EQ(get(security + "list_ftp_share").body, R"({"share":["Übung"]})");
}

TEST_F(HostRows, TheRowsAreListed) {
    const Json::Value rows = get("/api").json()["rows"];
    EXPECT_EQ(rows.size(), 16U);
    int reads = 0;
    for (const Json::Value& row : rows) {
        reads += row["read"].asBool() ? 1 : 0;
    }
    EXPECT_EQ(reads, 8);
}

TEST_F(HostRows, AChangeThatFailsHalfWayIsOneForThoseWhoHaveSeenTheSettings) {
    const std::string seen = get(sftp + "get").header("etag");
    access.commitFails = true;
    EXPECT_EQ(post(sftp + "set", R"({"enable":true,"portnum":2222})").status, 500);
    EXPECT_EQ(get(sftp + "get").header("etag"), seen) << "it was taken back";
    access.undone = false;
    EXPECT_EQ(post(sftp + "set", R"({"enable":true,"portnum":2223})").status, 500);
    EXPECT_NE(get(sftp + "get").header("etag"), seen);
}

TEST_F(HostRows, WhatWasSeenInAFormerRunIsNotTakenForTheSettingsOfThisOne) {
    const std::string seen = get(sftp + "get").header("etag");
    stop();
    start();
    const std::string ifSeen = admin + "If-Match: " + seen + "\r\n";
    EXPECT_EQ(ask("POST", sftp + "set", ifSeen, R"({"enable":true,"portnum":2222})").status, 412);
}

TEST_F(HostRows, AChangeOfWhatWasSeenIsRefusedOnceSomethingElseWasChanged) {
    const std::string seen = get(sftp + "get").header("etag");
    EXPECT_EQ(get(ftp + "3/get").header("etag"), seen) << "reading changes nothing";
    const std::string ifSeen = admin + "If-Match: " + seen + "\r\n";
    EXPECT_EQ(ask("POST", sftp + "set", ifSeen, R"({"enable":false,"portnum":22})").status, 204);
    EXPECT_EQ(get(sftp + "get").header("etag"), seen) << "nothing was different";
    const Answer first = ask("POST", sftp + "set", ifSeen, R"({"enable":true,"portnum":2222})");
    EXPECT_EQ(first.status, 204);
    EXPECT_NE(first.header("etag"), seen);
    const Answer second = ask("POST", sftp + "set", ifSeen, R"({"enable":true,"portnum":2223})");
    EXPECT_EQ(second.status, 412);
    EXPECT_EQ(second.json()["detail"],
              "The settings have changed since they were read. Nothing was changed.");
    EXPECT_EQ(platform.sftp.port, 2222);
    EXPECT_EQ(ask("GET", sftp + "get", ifSeen).status, 200) << "a read is no change";
    const std::string ifNow = admin + "If-Match: \"other\", " + first.header("etag") + "\r\n";
    EXPECT_EQ(ask("POST", sftp + "set", ifNow, R"({"enable":true,"portnum":2223})").status, 204);
    EXPECT_EQ(ask("POST", sftp + "set", admin + "If-Match: *\r\n", R"({"enable":true,"portnum":22})").status,
              204);
}

} // namespace
