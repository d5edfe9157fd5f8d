#include "tests/cli/cli_test.h"

namespace {

class DoctorTest : public CliTest {
protected:
    void answer(const std::string& findings) {
        host.answerWith("GET /api/health",
                        HttpReply{200, R"({"status": "any", "findings": [)" + findings + "]}",
                                  "application/json", false, false});
    }
};

constexpr const char* notice = R"({"id": "external-address-private", "severity": "notice", "subject": "ftp",
    "sentence": "It is private.", "mend": "veltctl ftp set ext_ip=ADDRESS"})";
constexpr const char* warning = R"({"id": "certificate-expires", "severity": "warning", "subject": "ftp",
    "sentence": "It expires soon.", "mend": "veltctl restart ftp"})";
constexpr const char* error = R"({"id": "service-down", "severity": "error", "subject": "sftp",
    "sentence": "It does \u001b[1m not run.", "mend": "veltctl restart sftp"})";

} // namespace

TEST_F(DoctorTest, AServerThatIsWellIsSaidToBe) {
    answer("");
    const RunResult result = run({"doctor"});
    EXPECT_EQ(result.code, 0) << result.err;
    EXPECT_EQ(result.out, "All is well.\n");
}

TEST_F(DoctorTest, EachFindingHasWhatMendsItBelow) {
    answer(std::string(error) + "," + warning + "," + notice);
    const RunResult result = run({"doctor"});
    EXPECT_EQ(result.code, 8);
    EXPECT_EQ(result.out, "error: It does \\x1b[1m not run. [service-down]\n"
                          "    veltctl restart sftp\n"
                          "warning: It expires soon. [certificate-expires]\n"
                          "    veltctl restart ftp\n"
                          "notice: It is private. [external-address-private]\n"
                          "    veltctl ftp set ext_ip=ADDRESS\n");
    EXPECT_EQ(result.err, "");
}

TEST_F(DoctorTest, NoticesAloneAreNoReasonToWorry) {
    answer(notice);
    const RunResult result = run({"doctor"});
    EXPECT_EQ(result.code, 0);
    EXPECT_EQ(result.out, "notice: It is private. [external-address-private]\n"
                          "    veltctl ftp set ext_ip=ADDRESS\n"
                          "Nothing else is wrong.\n");
    answer(warning);
    EXPECT_EQ(run({"doctor"}).code, 8);
}

TEST_F(DoctorTest, ProgramsGetTheServersObjectAndTheExitCode) {
    answer(error);
    const RunResult result = run({"doctor", "--json"});
    EXPECT_EQ(result.code, 8);
    EXPECT_EQ(jsonOf(result.out)["findings"][0]["id"], "service-down");
}

TEST_F(DoctorTest, AnAnswerOfAnotherFormIsNotGuessedAt) {
    for (const char* body : {"[]", "{}", R"({"findings": 5})", R"({"findings": [5]})"}) {
        host.answerWith("GET /api/health", HttpReply{200, body, "application/json", false, false});
        EXPECT_EQ(run({"doctor"}).code, 5) << body;
    }
}

TEST_F(DoctorTest, StatusSaysHowManyThereAre) {
    host.answerWith("GET /api/status",
                    HttpReply{200, R"({"version": "1", "uptime_seconds": 1, "services": []})",
                              "application/json", false, false});
    const auto lastLine = [this](const std::string& findings) {
        answer(findings);
        const std::string out = run({"status"}).out;
        return out.substr(out.find("PORT\n") + 5);
    };
    EXPECT_EQ(lastLine(notice), "");
    EXPECT_EQ(lastLine(warning), "\n1 warning: see 'veltctl doctor'.\n");
    EXPECT_EQ(lastLine(std::string(error) + "," + error + "," + warning),
              "\n2 errors and 1 warning: see 'veltctl doctor'.\n");
    EXPECT_EQ(run({"status"}).code, 0);
    host.answerWith("GET /api/health", problemReply(503, R"({"title": "Busy"})"));
    EXPECT_EQ(run({"status"}).code, 0) << "the status is known nevertheless";
}
