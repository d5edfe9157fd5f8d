#include "tests/cli/cli_test.h"

namespace {

const std::string newest = R"({"id": 12, "time": "2026-11-21T08:00:00Z", "actor": "anna", "address": "local",
    "way": "settings", "state": "waiting", "confirm_by": "2026-11-21T08:01:00Z",
    "changes": [{"field": "/ftp/timeout", "from": 300, "to": 600}]})";
const std::string older = R"({"id": 11, "time": "2026-11-21T07:00:00Z", "actor": "", "address": "",
    "way": "undo 9", "state": "undone", "changes": [{"field": "/a/1", "from": 1, "to": 2},
    {"field": "/a/2", "from": 1, "to": 2}, {"field": "/a/3", "from": 1, "to": 2}, {"field": "/a/4", "from": 1, "to": 2}]})";

class HistoryTest : public CliTest {
protected:
    void answer(const std::string& request, const std::string& body, int status = 200) {
        host.answerWith(request, HttpReply{status, body, "application/json", false, false});
    }
    void SetUp() override {
        answer("GET /api/history?limit=20", R"({"changes": [)" + newest + "," + older + R"(], "next": 11})");
        answer("GET /api/history?limit=100",
               R"({"changes": [)" + newest + "," + older + R"(], "next": null})");
    }
};

TEST_F(HistoryTest, ChangesAreListed) {
    EXPECT_EQ(run({"history"}).out,
              "ID  TIME                  STATE    BY     WITH      CHANGED\n"
              "12  2026-11-21T08:00:00Z  waiting  anna   settings  /ftp/timeout\n"
              "11  2026-11-21T07:00:00Z  undone   veltd  undo 9    /a/1, /a/2, /a/3 and 1 more\n"
              "Older ones: veltctl history --before 11\n");
    EXPECT_EQ(jsonOf(run({"history", "--json"}).out)["changes"].size(), 2U);
    answer("GET /api/history?limit=3&before=11", R"({"changes": [], "next": null})");
    EXPECT_EQ(run({"history", "--before", "11", "--limit", "3"}).code, 0);
    EXPECT_EQ(run({"history", "--limit", "0"}).code, 2);
}

TEST_F(HistoryTest, OneChangeIsShownFieldByField) {
    answer("GET /api/history/12", newest);
    EXPECT_EQ(run({"history", "12"}).out, "FIELD         FROM  TO\n/ftp/timeout  300   600\n");
    EXPECT_EQ(run({"history", "x"}).code, 2);
    answer("GET /api/history/7", R"({"title": "There is no change 7 in the history."})", 404);
    EXPECT_NE(run({"history", "7"}).err.find("'veltctl history' lists"), std::string::npos);
}

TEST_F(HistoryTest, TheNewestIsUndoneUnlessAnotherIsNamed) {
    const std::string report =
        R"({"dry_run": false, "changes": [{"field": "/ftp/timeout", "from": 600, "to": 300}], "effects": []})";
    answer("POST /api/history/12/undo", report);
    EXPECT_EQ(run({"undo"}).out, "ftp/timeout: 600 -> 300\n");
    answer("POST /api/history/11/undo?dry_run=true", R"({"dry_run": true, "changes": [], "effects": []})");
    EXPECT_EQ(run({"undo", "11", "--dry-run"}).out, "Nothing to change.\n");
    answer("GET /api/history?limit=100", R"({"changes": [)" + older + R"(], "next": null})");
    const RunResult none = run({"undo"});
    EXPECT_EQ(none.code, 3);
    EXPECT_NE(none.err.find("There is no change to undo."), std::string::npos) << none.err;
}

TEST_F(HistoryTest, AChangeThatWaitsTellsHowItIsConfirmed) {
    answer("POST /api/history/11/undo?confirm_within=60",
           R"({"changes": [{"field": "/ftp/timeout", "from": 600, "to": 300}], "effects": [], "id": 13,
               "confirm_by": "2026-11-21T08:01:00Z"})");
    EXPECT_EQ(run({"undo", "11", "--confirm-within", "60"}).out,
              "ftp/timeout: 600 -> 300\n"
              "The change is taken back at 2026-11-21T08:01:00Z unless you confirm it: veltctl confirm 13\n");
}

TEST_F(HistoryTest, TheOneThatWaitsIsConfirmed) {
    host.answerWith("POST /api/history/12/confirm", HttpReply{204, "", "", false, false});
    EXPECT_EQ(run({"confirm"}).out, "Change 12 stays.\n");
    EXPECT_EQ(jsonOf(run({"confirm", "12", "--json"}).out)["confirmed"], 12);
    answer("POST /api/history/12/confirm?dry_run=true",
           R"({"dry_run": true, "effects": [{"effect": "store", "subject": "history"}]})");
    EXPECT_EQ(run({"confirm", "-n"}).out, "  stores the history\nNothing was changed: this was a dry run.\n");
    answer("GET /api/history?limit=100", R"({"changes": [], "next": null})");
    EXPECT_NE(run({"confirm"}).err.find("There is no change to confirm."), std::string::npos);
}

TEST_F(HistoryTest, WhatIsNoIdIsRefusedInWords) {
    for (const Words& words : {Words{"history", "foo"}, {"undo", "0"}, {"confirm", "-1"}}) {
        const RunResult result = run(words);
        EXPECT_EQ(result.code, 2);
        EXPECT_NE(result.err.find("expected the number of a change"), std::string::npos) << result.err;
    }
}

TEST_F(HistoryTest, AChangeThatMayNotBeDoneIsNotTheNewestToUndo) {
    answer("GET /api/history?limit=100",
           R"({"changes": [{"id": 15, "state": "begun"}, {"id": 14, "state": "undone"},
               {"id": 13, "state": "done"}], "next": null})");
    answer("POST /api/history/13/undo",
           R"({"changes": [{"field": "/ftp/timeout", "from": 600, "to": 300}]})");
    EXPECT_EQ(run({"undo"}).out, "ftp/timeout: 600 -> 300\n");
}

TEST_F(HistoryTest, OfSeveralThatWaitOneHasToBeNamed) {
    answer("GET /api/history?limit=100",
           R"({"changes": [{"id": 14, "state": "waiting"}, {"id": 13, "state": "done"},
               {"id": 12, "state": "waiting"}], "next": null})");
    const RunResult result = run({"confirm"});
    EXPECT_EQ(result.code, 3);
    EXPECT_NE(result.err.find("Several changes wait for their confirmation: 14, 12."), std::string::npos)
        << result.err;
    EXPECT_NE(result.err.find("veltctl confirm 14"), std::string::npos) << result.err;
    host.answerWith("POST /api/history/12/confirm", HttpReply{204, "", "", false, false});
    EXPECT_EQ(run({"confirm", "12"}).out, "Change 12 stays.\n");
}

TEST_F(HistoryTest, TwoStatesAreCompared) {
    answer("POST /api/diff", R"({"changes": [{"field": "/ftp/timeout", "from": 300, "to": 600}]})");
    const RunResult result = run({"diff", "11", "12"});
    EXPECT_EQ(result.code, 7);
    EXPECT_EQ(result.out, "ftp/timeout: 300 -> 600\n");
    EXPECT_EQ(sent("POST /api/diff").back(), jsonOf(R"({"from": 11, "to": 12})"));
    EXPECT_EQ(jsonOf(run({"diff", "11", "--json"}).out)["changes"].size(), 1U);
    EXPECT_EQ(sent("POST /api/diff").back(), jsonOf(R"({"from": 11, "to": "now"})"));
    answer("POST /api/diff", R"({"changes": []})");
    const RunResult same = run({"diff", "-", "now"}, R"({"ftp": {}})");
    EXPECT_EQ(same.code, 0);
    EXPECT_EQ(same.out, "No difference.\n");
    EXPECT_EQ(sent("POST /api/diff").back(), jsonOf(R"({"from": {"ftp": {}}, "to": "now"})"));
    EXPECT_EQ(run({"diff"}).code, 2);
    EXPECT_EQ(run({"diff", folder.path("absent")}).code, 1);
    answer("POST /api/diff", R"({"title": "There is no change 99 in the history."})", 404);
    const RunResult unknown = run({"diff", "99"});
    EXPECT_EQ(unknown.code, 3);
    EXPECT_NE(unknown.err.find("'veltctl history' lists"), std::string::npos) << unknown.err;
}

} // namespace

using RestartTest = CliTest;

TEST_F(RestartTest, SaysWhatBecameOfTheSessions) {
    host.answerWith("POST /api/restart?sessions=keep&service=ftp",
                    HttpReply{200, R"({"services": [{"service": "ftp", "ended": 0, "kept": 3}]})",
                              "application/json", false, false});
    EXPECT_EQ(run({"restart", "ftp"}).out, "ftp: restarted, 3 sessions go on, 0 ended\n"
                                           "The services that are on run with what is stored now.\n");
    host.answerWith("POST /api/restart?sessions=end",
                    HttpReply{200, R"({"services": [{"service": "sftp", "ended": 0, "kept": 0}]})",
                              "application/json", false, false});
    EXPECT_EQ(run({"restart", "--end-sessions"}).out,
              "sftp: restarted\nThe services that are on run with what is stored now.\n");
    EXPECT_EQ(run({"restart", "ftps"}).code, 2);
    host.answerWith("POST /api/restart?sessions=keep&dry_run=true",
                    HttpReply{200,
                              R"({"dry_run": true, "effects": [{"effect": "hand over", "subject": "ftp"}]})",
                              "application/json", false, false});
    const RunResult plan = run({"restart", "--dry-run"});
    EXPECT_EQ(plan.code, 7);
    EXPECT_EQ(plan.out, "  hands the port of ftp over to a new daemon\n"
                        "Nothing was changed: this was a dry run.\n");
}
