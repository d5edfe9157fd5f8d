#include "tests/cli/cli_test.h"

namespace {

class StatusTest : public CliTest {
protected:
    void answer(const std::string& body) {
        host.answerWith("GET /api/status", HttpReply{200, body, "application/json", false, false});
    }
};

constexpr const char* status = R"({"version": "1.0.0", "uptime_seconds": 93784, "services": [
    {"name": "ftp", "enabled": true, "port": 21}, {"name": "ftps", "enabled": false, "port": 21},
    {"name": "sftp", "enabled": true, "port": 2222}]})";

} // namespace

TEST_F(StatusTest, TheServicesAreShown) {
    answer(status);
    const RunResult result = run({"status"});
    EXPECT_EQ(result.code, 0) << result.err;
    EXPECT_EQ(result.out, "veltd 1.0.0, up for 1 d 2 h\n\n"
                          "SERVICE  STATE  PORT\n"
                          "ftp      on     21\n"
                          "ftps     off    21\n"
                          "sftp     on     2222\n");
}

TEST_F(StatusTest, AServiceThatIsSwitchedOnAndDoesNotRunIsDown) {
    answer(R"({"version": "1.0.0", "uptime_seconds": 1, "services": [
        {"name": "ftp", "enabled": true, "wanted": true, "running": false, "port": 21, "reason": "No luck."},
        {"name": "ftps", "enabled": true, "wanted": true, "running": false, "port": 21, "reason": "No luck."},
        {"name": "sftp", "enabled": false, "wanted": true, "running": false, "port": 22, "reason": "Paused."}]})");
    EXPECT_EQ(run({"status"}).out, "veltd 1.0.0, up for 1 s\n\n"
                                   "SERVICE  STATE  PORT\n"
                                   "ftp      down   21\n"
                                   "ftps     down   21\n"
                                   "sftp     down   22\n"
                                   "\nftp: No luck.\n"
                                   "\nsftp: Paused.\n");
    answer(R"({"version": "1.0.0", "uptime_seconds": 1, "services": [
        {"name": "ftp", "enabled": false, "wanted": false, "running": false, "port": 21},
        {"name": "sftp", "enabled": true, "wanted": true, "running": true, "port": 22, "reason": "Refused."}]})");
    EXPECT_EQ(run({"status"}).out, "veltd 1.0.0, up for 1 s\n\n"
                                   "SERVICE  STATE  PORT\n"
                                   "ftp      off    21\n"
                                   "sftp     on     22\n"
                                   "\nsftp: Refused.\n");
}

TEST_F(StatusTest, ProgramsGetTheServersObject) {
    answer(status);
    EXPECT_EQ(jsonOf(run({"status", "--json"}).out), jsonOf(status));
}

TEST_F(StatusTest, AnAnswerOfAnotherFormIsNotGuessedAt) {
    for (const char* body :
         {"[]", "5", R"({"uptime_seconds": "long"})", R"({"uptime_seconds": 1, "services": [7]})"}) {
        answer(body);
        const RunResult result = run({"status"});
        EXPECT_EQ(result.code, std::string(body).find("services") == std::string::npos ? 5 : 0)
            << body << result.err;
    }
}

TEST_F(StatusTest, AnAnswerThatIsNotJsonIsNotFromVeltd) {
    answer("<html>");
    EXPECT_EQ(run({"status"}).code, 6);
    answer("{\"a\": 1} trailing");
    EXPECT_EQ(run({"status"}).code, 6);
    answer("");
    EXPECT_EQ(run({"status"}).code, 6);
}
