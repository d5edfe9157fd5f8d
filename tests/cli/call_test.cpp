#include "tests/cli/cli_test.h"

namespace {
const std::string sftpApi = "VELT.Core.FileServ.FTP.SFTP";
}

using CallTest = CliTest;

TEST_F(CallTest, AnAnswerIsShownAsJson) {
    EXPECT_EQ(jsonOf(run({"call", sftpApi, "1", "get"}).out), host.sftp);
    EXPECT_EQ(sent("POST /api/" + sftpApi + "/v1/get").at(0), Json::Value(Json::objectValue));
}

TEST_F(CallTest, ParametersAreSentAsTheyAre) {
    host.answerWith(sftpSet, HttpReply{204, "", "", false, false});
    const RunResult result =
        run({"call", sftpApi, "1", "set", R"({"enable": true, "portnum": [1, null, "ü"]})"});
    EXPECT_EQ(result.code, 0) << result.err;
    EXPECT_EQ(result.out, "");
    EXPECT_EQ(sent(sftpSet).at(0), jsonOf(R"({"enable": true, "portnum": [1, null, "ü"]})"));
    EXPECT_EQ(run({"call", sftpApi, "1", "set", "-"}, R"({"enable": false})").code, 0);
    EXPECT_EQ(sent(sftpSet).at(1), jsonOf(R"({"enable": false})"));
}

TEST_F(CallTest, AChangeTakesItsOptions) {
    const std::string method = "POST /api/A/v2/set";
    host.answerWith(method + "?dry_run=true&sessions=keep",
                    HttpReply{200, R"({"dry_run": true, "effects": [{"effect": "start", "subject": "ftp"}]})",
                              "application/json", false, false});
    const RunResult plan = run({"call", "A", "2", "set", "--dry-run", "--keep-sessions"});
    EXPECT_EQ(plan.code, 7);
    EXPECT_EQ(plan.out, "  starts ftp\nNothing was changed: this was a dry run.\n");
    host.answerWith(method + "?confirm_within=9", HttpReply{204, "", "", false, false});
    EXPECT_EQ(run({"call", "A", "2", "set", "--confirm-within", "9"}).code, 0);
}

TEST_F(CallTest, AnAnswerMayBeAnyValue) {
    host.answerWith("POST /api/A/v2/b", HttpReply{200, "\"text\"", "application/json", false, false});
    EXPECT_EQ(run({"call", "A", "2", "b"}).out, "\"text\"\n");
}

TEST_F(CallTest, NamesCannotLeaveThePath) {
    EXPECT_EQ(run({"call", "a/../b?c", "1", "x y"}).code, 3);
    EXPECT_EQ(asked().at(0), "POST /api/a%2F..%2Fb%3Fc/v1/x%20y");
}

TEST_F(CallTest, WordsThatMakeNoRequestAreUsageErrors) {
    EXPECT_EQ(run({"call"}).code, 2);
    EXPECT_EQ(run({"call", sftpApi, "1"}).code, 2);
    const RunResult zero = run({"call", sftpApi, "0", "get"});
    EXPECT_EQ(zero.code, 2);
    EXPECT_NE(zero.err.find("99"), std::string::npos) << zero.err;
    EXPECT_EQ(run({"call", sftpApi, "one", "get"}).code, 2);
    EXPECT_EQ(run({"call", sftpApi, "1", "get", "[]"}).code, 2);
    EXPECT_EQ(run({"call", sftpApi, "1", "get", "{"}).code, 2);
    EXPECT_EQ(run({"call", sftpApi, "1", "get", "{}", "{}"}).code, 2);
    EXPECT_EQ(run({"call", sftpApi, "1", "get", std::string(5000, '[')}).code, 2);
    EXPECT_TRUE(asked().empty());
}

TEST_F(CallTest, AnUnknownMethodPointsToTheList) {
    const RunResult result = run({"call", "Other", "1", "get"});
    EXPECT_EQ(result.code, 3);
    EXPECT_NE(result.err.find("call --list"), std::string::npos) << result.err;
}

TEST_F(CallTest, TheMethodsAreListed) {
    const std::string rows = R"({"rows": [{"api": "A.B", "version": 3, "method": "get", "read": true},
                                          {"api": "A.B", "version": 3, "method": "set", "read": false}]})";
    host.answerWith("GET /api", HttpReply{200, rows, "application/json", false, false});
    EXPECT_EQ(run({"call", "--list"}).out, "API  VERSION  METHOD  CHANGES\n"
                                           "A.B  3        get     no\n"
                                           "A.B  3        set     yes\n");
    EXPECT_EQ(jsonOf(run({"call", "--list", "--json"}).out), jsonOf(rows));
}
