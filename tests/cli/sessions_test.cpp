// Who is logged in, as administrators see and end it.
#include "tests/cli/cli_test.h"

#include <algorithm>

namespace {

constexpr const char* two = R"({"sessions": [
    {"id": "a1", "user": "anna", "protocol": "ftps", "address": "192.0.2.1", "since": "2026-11-21T08:00:00.000Z",
     "busy": true, "command": "STOR", "path": "/x", "rate": 1500000, "current": false,
     "transfer": {"direction": "upload", "path": "/docs/big file", "octets": 5, "since": "2026-11-21T08:00:01.000Z"}},
    {"id": "b2", "user": "b\u001bn", "protocol": "sftp", "address": "2001:db8::1", "since": "2026-11-21T09:00:00.000Z",
     "busy": false, "command": "rename", "path": "/y", "rate": 0, "current": true, "transfer": null},
    {"id": "c3", "user": "c", "protocol": "ftp", "address": "192.0.2.1", "since": "2026-11-21T09:00:00.000Z",
     "busy": true, "command": "LIST", "path": "", "rate": 0, "current": true, "transfer": null}]})";

class SessionsTest : public CliTest {
protected:
    void answer(const std::string& request, const std::string& body, int status = 200) {
        host.answerWith(request, HttpReply{status, body, "application/json", false, false});
    }
};

} // namespace

TEST_F(SessionsTest, AreListed) {
    answer("GET /api/sessions", two);
    EXPECT_EQ(run({"sessions"}).out,
              "ID  USER    PROTOCOL  ADDRESS      SINCE                     STATE                     FILE   "
              "         "
              "RATE\n"
              "a1  anna    ftps      192.0.2.1    2026-11-21T08:00:00.000Z  upload (former settings)  "
              "/docs/big file  "
              "1.5 MB/s\n"
              "b2  b\\x1bn  sftp      2001:db8::1  2026-11-21T09:00:00.000Z  idle                      /y\n"
              "c3  c       ftp       192.0.2.1    2026-11-21T09:00:00.000Z  busy\n");
    EXPECT_EQ(jsonOf(run({"sessions", "--json"}).out), jsonOf(two));
}

TEST_F(SessionsTest, AreFiltered) {
    answer("GET /api/sessions?user=a%20b&address=192.0.2.0%2F24&protocol=ftp", R"({"sessions": []})");
    const RunResult result =
        run({"sessions", "--user", "a b", "--address", "192.0.2.0/24", "--protocol", "ftp"});
    EXPECT_EQ(result.code, 0) << result.err;
    EXPECT_EQ(result.out, "ID  USER  PROTOCOL  ADDRESS  SINCE  STATE  FILE  RATE\n");
    EXPECT_EQ(run({"sessions", "--protocol", "ssh"}).code, 2);
}

TEST_F(SessionsTest, AreShownAgainEverySecond) {
    answer("GET /api/sessions?user=anna", two);
    interrupt = 3; // a little into the first second, unless the machine is very slow
    RunResult result = run({"sessions", "--watch", "--user", "anna"});
    EXPECT_EQ(result.code, 0) << result.err;
    EXPECT_NE(result.out.find("Z\ta1\tanna\tftps\t192.0.2.1\t"), std::string::npos) << result.out;
    EXPECT_NE(result.out.find("\tb\\x1bn\t"), std::string::npos) << result.out;
    EXPECT_EQ(std::count(result.out.begin(), result.out.end(), '\n'),
              static_cast<std::ptrdiff_t>(3 * asked().size()))
        << result.out;
    interruptionsAsked = 0;
    interrupt = 30; // in the second one, or later
    result = run({"sessions", "--watch", "--user", "anna", "--json"});
    const auto lineEnd = result.out.find('\n');
    EXPECT_EQ(jsonOf(result.out.substr(0, lineEnd)), jsonOf(two));
    EXPECT_GE(std::count(result.out.begin(), result.out.end(), '\n'), 2) << result.out;
}

TEST_F(SessionsTest, ATerminalIsDrawnAnew) {
    answer("GET /api/sessions", two);
    interrupt = 3;
    outputIsTerminal = true;
    const RunResult result = run({"sessions", "--watch"});
    EXPECT_EQ(result.code, 0);
    EXPECT_EQ(result.out.substr(0, 7), "\033[H\033[2J");
    EXPECT_NE(result.out.find("Z  3 sessions\n\nID  USER"), std::string::npos) << result.out;
    const std::string last = result.out.substr(result.out.rfind("\033[H\033[2J") + 7);
    EXPECT_EQ(last.find('\033'), std::string::npos) << "nothing else steers it";
}

TEST_F(SessionsTest, AServerThatIsGoneEndsTheWatch) {
    host.answerWith("GET /api/sessions", problemReply(401, R"({"title": "Who asks?"})"));
    EXPECT_EQ(run({"sessions", "--watch"}).code, 6);
}

TEST_F(SessionsTest, OneIsEnded) {
    answer("DELETE /api/sessions/a1?reason=too%20much", "", 204);
    EXPECT_EQ(run({"kick", "a1", "--reason", "too much"}).out, "1 session was ended.\n");
    EXPECT_EQ(jsonOf(run({"kick", "a1", "--reason", "too much", "--json"}).out)["ended"], 1);
}

TEST_F(SessionsTest, AreEndedByUserOrAddress) {
    answer("DELETE /api/sessions?user=anna", R"({"ended": 3})");
    EXPECT_EQ(run({"kick", "--user", "anna"}).out, "3 sessions were ended.\n");
    EXPECT_EQ(jsonOf(run({"kick", "--user", "anna", "--json"}).out)["ended"], 3);
    answer("DELETE /api/sessions?address=2001%3Adb8%3A%3A%2F64", R"({"ended": 0})");
    EXPECT_EQ(run({"kick", "--address", "2001:db8::/64"}).out, "There was no such session.\n");
}

TEST_F(SessionsTest, OneThatIsNotThereNamesTheList) {
    host.answerWith("DELETE /api/sessions/zz",
                    problemReply(404, R"({"detail": "There is no session zz.", "title": "Not Found"})"));
    const RunResult result = run({"kick", "zz"});
    EXPECT_EQ(result.code, 3);
    EXPECT_NE(result.err.find("There is no session zz."), std::string::npos) << result.err;
    EXPECT_NE(result.err.find("'veltctl sessions' lists"), std::string::npos) << result.err;
}

TEST_F(SessionsTest, ADryRunEndsNone) {
    answer("DELETE /api/sessions?user=anna&dry_run=true",
           R"({"dry_run": true, "sessions_ended": 2, "effects": [
               {"effect": "log", "subject": "The session a1 of \"anna\" was ended."}]})");
    const RunResult result = run({"kick", "--user", "anna", "--dry-run"});
    EXPECT_EQ(result.code, 7);
    EXPECT_EQ(result.out, "  writes into the log: The session a1 of \"anna\" was ended.\n"
                          "Nothing was changed: this was a dry run.\n"
                          "2 sessions would be ended.\n");
}

TEST_F(SessionsTest, SayWhichToEnd) {
    for (const Words& words :
         {Words{"kick"}, Words{"kick", "--user", ""}, Words{"kick", "--reason", "x"},
          Words{"kick", "a1", "--user", "anna"}, Words{"kick", "a1", "--address", "x"}}) {
        const RunResult result = run(words);
        EXPECT_EQ(result.code, 2);
        EXPECT_NE(result.err.find("Name one session, or --user or --address."), std::string::npos);
    }
    EXPECT_TRUE(asked().empty());
}
