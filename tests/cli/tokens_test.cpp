#include "tests/cli/cli_test.h"

using TokensTest = CliTest;

TEST_F(TokensTest, TokensAreListed) {
    const std::string tokens =
        R"({"tokens": [{"id": "t1", "name": "backup", "role": "viewer", "created": "2026-11-21T08:00:00Z"}]})";
    host.answerWith("GET /api/tokens", HttpReply{200, tokens, "application/json", false, false});
    EXPECT_EQ(run({"tokens", "list"}).out, "ID  NAME    ROLE    CREATED\n"
                                           "t1  backup  viewer  2026-11-21T08:00:00Z\n");
    EXPECT_EQ(jsonOf(run({"tokens", "list", "--json"}).out), jsonOf(tokens));
}

TEST_F(TokensTest, ATokenIsMadeAndStandsAloneOnTheOutput) {
    const std::string token = R"({"id": "t2", "name": "desk", "role": "admin", "token": "secret-word"})";
    host.answerWith("POST /api/tokens", HttpReply{201, token, "application/json", false, false});
    const RunResult result = run({"tokens", "create", "desk", "--role", "admin"});
    EXPECT_EQ(result.code, 0);
    EXPECT_EQ(result.out, "secret-word\n");
    EXPECT_NE(result.err.find("Token t2 for desk (admin)"), std::string::npos) << result.err;
    EXPECT_EQ(sent("POST /api/tokens").at(0), jsonOf(R"({"name": "desk", "role": "admin"})"));
    EXPECT_EQ(jsonOf(run({"tokens", "create", "desk", "--json"}).out)["token"], "secret-word");
    EXPECT_EQ(sent("POST /api/tokens").at(1)["role"], "viewer");
    EXPECT_EQ(run({"tokens", "create", "desk", "--role", "root"}).code, 2);
    EXPECT_EQ(run({"tokens", "create"}).code, 2);
}

TEST_F(TokensTest, ADryRunOnlySaysWhatWouldBeDone) {
    const HttpReply plan{200,
                         R"({"dry_run": true, "changes": [], "effects": [
                             {"effect": "store", "subject": "tokens"}, {"effect": "log", "subject": "Done."}]})",
                         "application/json", false, false};
    host.answerWith("POST /api/tokens?dry_run=true", plan);
    host.answerWith("DELETE /api/tokens/t1?dry_run=true", plan);
    for (const Words& words :
         {Words{"tokens", "create", "desk", "--dry-run"}, Words{"tokens", "delete", "t1", "-n"}}) {
        const RunResult result = run(words);
        EXPECT_EQ(result.code, 7);
        EXPECT_EQ(result.out, "  stores the tokens\n  writes into the log: Done.\n"
                              "Nothing was changed: this was a dry run.\n");
        Words asJson = words;
        asJson.push_back("--json");
        EXPECT_EQ(jsonOf(run(asJson).out)["effects"].size(), 2U);
    }
}

TEST_F(TokensTest, ATokenIsMadeInvalid) {
    host.answerWith("DELETE /api/tokens/t%2F1", HttpReply{204, "", "", false, false});
    EXPECT_EQ(run({"tokens", "delete", "t/1"}).out, "Token t/1 is no longer valid.\n");
    EXPECT_EQ(jsonOf(run({"tokens", "delete", "t/1", "--json"}).out)["deleted"], "t/1");
    host.answerWith("DELETE /api/tokens/t9", problemReply(404, R"({"title": "No such token"})"));
    const RunResult result = run({"tokens", "delete", "t9"});
    EXPECT_EQ(result.code, 3);
    EXPECT_NE(result.err.find("No such token"), std::string::npos) << result.err;
    EXPECT_NE(result.err.find("'veltctl tokens list' lists"), std::string::npos) << result.err;
    EXPECT_EQ(result.err.find("methods"), std::string::npos) << result.err;
}
