// Where the server is looked for, and what it is told about who asks.
#include "tests/cli/cli_test.h"

namespace {

constexpr const char* authorization = "Authorization: Bearer ";

class AccessTest : public CliTest {
protected:
    std::string headOfLast() const { return server.requests().back().head; }
};

} // namespace

TEST_F(AccessTest, TheSocketOfTheEnvironmentIsAsked) {
    EXPECT_EQ(run({"sftp", "get"}).code, 0);
    EXPECT_EQ(headOfLast().find(authorization), std::string::npos);
}

TEST_F(AccessTest, OptionsGoBeforeTheEnvironment) {
    environment = {{"VELT_URL", "http://127.0.0.1:1"}, {"VELT_SOCKET", "/nowhere"}};
    EXPECT_EQ(run({"sftp", "get", "--socket", server.socketPath()}).code, 0);
    EXPECT_EQ(run({"--url", server.url(), "sftp", "get"}).code, 0);
    EXPECT_EQ(run({"--url=" + server.url() + "/", "sftp", "get"}).code, 0);
    EXPECT_EQ(asked().back(), "GET /api/VELT.Core.FileServ.FTP.SFTP/v1/get");
    EXPECT_EQ(run({"sftp", "get"}).code, 6);
}

TEST_F(AccessTest, TheAddressOfTheEnvironmentGoesBeforeItsSocket) {
    environment = {{"VELT_URL", server.url()}, {"VELT_SOCKET", "/nowhere"}};
    EXPECT_EQ(run({"sftp", "get"}).code, 0);
}

TEST_F(AccessTest, TheTokenComesFromTheEnvironmentOrAFile) {
    environment = {{"VELT_URL", server.url()}, {"VELT_TOKEN", "one"}};
    EXPECT_EQ(run({"sftp", "get"}).code, 0);
    EXPECT_NE(headOfLast().find("Authorization: Bearer one\r\n"), std::string::npos) << headOfLast();
    EXPECT_EQ(run({"sftp", "get", "--token-file", folder.write("token", "two\n")}).code, 0);
    EXPECT_NE(headOfLast().find("Authorization: Bearer two\r\n"), std::string::npos) << headOfLast();
    EXPECT_EQ(run({"sftp", "get", "--token-file", folder.path("absent")}).code, 1);
}

TEST_F(AccessTest, ATokenCannotBringAHeaderOfItsOwn) {
    environment["VELT_TOKEN"] = "one\r\nX-Other: two";
    EXPECT_EQ(run({"sftp", "get"}).code, 2);
    EXPECT_TRUE(asked().empty());
}

TEST_F(AccessTest, ATokenIsNotSentUnencryptedToAnotherMachine) {
    environment = {{"VELT_TOKEN", "one"}};
    for (const char* url : {"http://192.0.2.1:80", "http://127.example.org", "http://localhost@192.0.2.1/"}) {
        const RunResult result = run({"--url", url, "sftp", "get"});
        EXPECT_EQ(result.code, 2) << url;
        EXPECT_NE(result.err.find("unencrypted"), std::string::npos) << result.err;
    }
}

TEST_F(AccessTest, AnInvalidAddressIsAUsageError) {
    for (const char* url : {"ftp://127.0.0.1", "127.0.0.1:80", "http://", "file:///etc/passwd"}) {
        EXPECT_EQ(run({"--url", url, "status"}).code, 2) << url;
    }
    EXPECT_EQ(run({"--url", server.url(), "--socket", server.socketPath(), "status"}).code, 2);
}

TEST_F(AccessTest, AnAbsentServerSaysHowToStartIt) {
    environment = {{"VELT_SOCKET", folder.path("absent.sock")}};
    const RunResult result = run({"status"});
    EXPECT_EQ(result.code, 6);
    EXPECT_EQ(result.err, "veltctl: Cannot connect to " + folder.path("absent.sock") +
                              ": No such file or directory.\nWhat to do: Start veltd, or say where it "
                              "listens: at a Unix socket "
                              "(--socket or VELT_SOCKET) or an address (--url or VELT_URL).\n");
}

TEST_F(AccessTest, ARefusedConnectionNamesTheAddress) {
    environment = {{"VELT_URL", "http://127.0.0.1:1"}};
    const RunResult result = run({"status"});
    EXPECT_EQ(result.code, 6);
    EXPECT_NE(result.err.find("Cannot connect to http://127.0.0.1:1: Connection refused."), std::string::npos)
        << result.err;
    EXPECT_NE(result.err.find("--url"), std::string::npos) << result.err;
}

TEST_F(AccessTest, AConnectionThatEndsWithoutAnAnswerIsAnError) {
    HttpReply nothing;
    nothing.drop = true;
    host.answerWith("GET /api/status", nothing);
    EXPECT_EQ(run({"status"}).code, 6);
}

TEST_F(AccessTest, ASlowAnswerEndsAtTheTimeout) {
    HttpReply slow;
    slow.stream = true; // without an end
    host.answerWith("GET /api/status", slow);
    const RunResult result = run({"status", "--timeout", "1"});
    EXPECT_EQ(result.code, 6);
    EXPECT_NE(result.err.find("may still take effect"), std::string::npos) << result.err;
    EXPECT_EQ(run({"status", "--timeout", "0"}).code, 2);
}

TEST_F(AccessTest, AnAnswerThatIsTooLongIsNotTaken) {
    HttpReply endless;
    endless.body = std::string(std::size_t{65} * 1024 * 1024, ' ');
    host.answerWith("GET /api/status", endless);
    const RunResult result = run({"status"});
    EXPECT_EQ(result.code, 6);
    EXPECT_NE(result.err.find("The answer is too long to be from veltd."), std::string::npos) << result.err;
}

TEST_F(AccessTest, AProxyOfTheEnvironmentDoesNotSeeTheToken) {
    const RunResult result = runProcess({VELTCTL, "sftp", "get"},
                                        {"VELT_URL=" + server.url(), "VELT_TOKEN=one",
                                         "http_proxy=http://127.0.0.1:1", "all_proxy=http://127.0.0.1:1"});
    EXPECT_EQ(result.code, 0) << result.err;
}

TEST_F(AccessTest, EachRefusalSaysWhatWouldHelp) {
    const auto hint = [this](int status, const std::map<std::string, std::string>& variables) {
        host.answerWith("GET /api/status", problemReply(status, R"({"title": "No"})"));
        environment = variables;
        const RunResult result = run({"status"});
        EXPECT_EQ(result.code, 6);
        return result.err.substr(result.err.find("What to do: "));
    };
    const std::string url = server.url();
    EXPECT_NE(hint(401, {{"VELT_SOCKET", server.socketPath()}}).find("velt-admin"), std::string::npos);
    EXPECT_NE(hint(401, {{"VELT_URL", url}}).find("VELT_TOKEN"), std::string::npos);
    EXPECT_NE(hint(401, {{"VELT_URL", url}, {"VELT_TOKEN", "old"}}).find("not valid"), std::string::npos);
    EXPECT_NE(hint(403, {{"VELT_URL", url}, {"VELT_TOKEN", "viewer"}}).find("role admin"), std::string::npos);
}
