#include "tests/cli/cli_test.h"

using BansTest = CliTest;

TEST_F(BansTest, BansAreListed) {
    const std::string bans =
        R"({"bans": [{"address": "192.0.2.1", "service": "sftp", "failures": 10, "until": "2026-11-21T08:00:00Z"}],
            "firewall": true})";
    host.answerWith("GET /api/bans", HttpReply{200, bans, "application/json", false, false});
    const RunResult shown = run({"bans", "list"});
    EXPECT_EQ(shown.out, "ADDRESS    SERVICE  FAILURES  UNTIL\n"
                         "192.0.2.1  sftp     10        2026-11-21T08:00:00Z\n");
    EXPECT_EQ(shown.err, "");
    EXPECT_EQ(jsonOf(run({"bans", "list", "--json"}).out), jsonOf(bans));
}

TEST_F(BansTest, BansThatNobodyEnforcesAreListedAsSuch) {
    const auto answer = [this](const std::string& bans) {
        host.answerWith("GET /api/bans", HttpReply{200, R"({"firewall": false, "bans": [)" + bans + "]}",
                                                   "application/json", false, false});
        return run({"bans", "list"}).err;
    };
    EXPECT_EQ(answer(R"({"address": "192.0.2.1", "service": "ftp", "failures": 3, "until": "x"})"),
              "The firewall is off: FTP refuses these addresses' logins, and SFTP does not refuse them.\n");
    EXPECT_EQ(answer(""), "");
}

TEST_F(BansTest, ABanIsLifted) {
    host.answerWith("DELETE /api/bans/2001%3Adb8%3A%3A%2F64", HttpReply{204, "", "", false, false});
    EXPECT_EQ(run({"bans", "lift", "2001:db8::/64"}).out, "2001:db8::/64 is no longer banned.\n");
    EXPECT_EQ(jsonOf(run({"bans", "lift", "2001:db8::/64", "--json"}).out)["lifted"], "2001:db8::/64");
    host.answerWith("DELETE /api/bans/192.0.2.9",
                    problemReply(404, R"({"title": "There is no ban of 192.0.2.9."})"));
    host.answerWith("DELETE /api/bans/192.0.2.1?dry_run=true",
                    HttpReply{200,
                              R"({"dry_run": true, "effects": [{"effect": "store", "subject": "bans"}]})",
                              "application/json", false, false});
    EXPECT_EQ(run({"bans", "lift", "192.0.2.1", "--dry-run"}).code, 7);
    const RunResult result = run({"bans", "lift", "192.0.2.9"});
    EXPECT_EQ(result.code, 3);
    EXPECT_NE(result.err.find("'veltctl bans list' lists"), std::string::npos) << result.err;
    EXPECT_EQ(run({"bans", "lift"}).code, 2);
    EXPECT_EQ(run({"bans"}).code, 2);
}
