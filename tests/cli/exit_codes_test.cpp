// The documented exit codes, of the built program.
#include "tests/cli/cli_test.h"

class ExitCodesTest : public CliTest {
protected:
    int codeOf(const Words& words) {
        std::vector<std::string> arguments{VELTCTL};
        arguments.insert(arguments.end(), words.begin(), words.end());
        last = runProcess(arguments, {"VELT_SOCKET=" + server.socketPath()});
        return last.code;
    }

    int codeAfter(int status) {
        host.answerWith(change, problemReply(status, R"({"title": "A title", "request_id": "r-1"})"));
        return codeOf({"ftp", "set", "portnum=2121"});
    }

    RunResult last;
};

TEST_F(ExitCodesTest, Done) {
    EXPECT_EQ(codeOf({"sftp", "get"}), 0);
    EXPECT_EQ(last.out.substr(0, 7), "SETTING");
    EXPECT_EQ(codeOf({"sftp", "set", "portnum=2222"}), 0);
    EXPECT_EQ(codeOf({"--help"}), 0);
    EXPECT_NE(last.out.find("Exit codes: 0 done"), std::string::npos);
    EXPECT_EQ(codeOf({"ftp", "set", "--help"}), 0);
    EXPECT_NE(last.out.find("maxuploadrate"), std::string::npos);
    EXPECT_EQ(codeOf({"--version"}), 0);
    EXPECT_EQ(last.err, "");
}

TEST_F(ExitCodesTest, LocalFile) {
    EXPECT_EQ(codeOf({"export", "-o", folder.path("absent/file")}), 1);
    EXPECT_NE(last.err.find("Cannot write " + folder.path("absent/file") + ": No such file"),
              std::string::npos)
        << last.err;
}

TEST_F(ExitCodesTest, Usage) {
    for (const Words& words :
         {Words{}, Words{"other"}, Words{"ftp"}, Words{"ftp", "other"}, Words{"--other"},
          Words{"ftp", "set", "other=1"}, Words{"status", "extra"}, Words{"chroot", "rules"}}) {
        EXPECT_EQ(codeOf(words), 2) << testing::PrintToString(words);
        EXPECT_EQ(last.out, "");
        EXPECT_EQ(last.err.substr(0, 9), "veltctl: ");
        EXPECT_NE(last.err.find("What to do: "), std::string::npos) << last.err;
    }
    EXPECT_TRUE(asked().empty());
}

TEST_F(ExitCodesTest, RefusedInput) {
    EXPECT_EQ(codeAfter(422), 3);
    EXPECT_EQ(codeAfter(400), 3);
    EXPECT_EQ(codeAfter(404), 3);
    EXPECT_NE(last.err.find("'veltctl call --list' lists"), std::string::npos) << last.err;
    EXPECT_EQ(last.err.find("token"), std::string::npos) << last.err;
    EXPECT_EQ(codeAfter(405), 3);
    EXPECT_EQ(codeAfter(413), 3);
}

TEST_F(ExitCodesTest, Conflict) {
    EXPECT_EQ(codeAfter(409), 4);
    EXPECT_NE(last.err.find("Mend what the server names"), std::string::npos) << last.err;
    EXPECT_EQ(codeAfter(412), 4);
    EXPECT_NE(last.err.find("Read them again"), std::string::npos);
}

TEST_F(ExitCodesTest, EachConflictHasItsOwnAdvice) {
    const auto adviceAfter = [&](const std::string& path, const Words& words, const char* problem) {
        host.answerWith("POST " + path, problemReply(409, problem));
        EXPECT_EQ(codeOf(words), 4);
        return last.err.substr(last.err.find("What to do: "));
    };
    const std::string undo = "/api/history/7/undo";
    EXPECT_EQ(
        adviceAfter(undo, {"undo", "7"},
                    R"({"detail": "/ftp/timeout was changed again since. Nothing was changed.",
                              "changed": false, "errors": [{"field": "/ftp/timeout", "expected": "600"}]})"),
        "What to do: 'veltctl history' lists the later change: undo that one first, or set by hand what "
        "you want.\n");
    EXPECT_EQ(adviceAfter(undo, {"undo", "7"}, R"({"detail": "The change 7 is undone already."})"),
              "What to do: 'veltctl history' tells the state of each change.\n");
    EXPECT_EQ(adviceAfter("/api/history/7/confirm", {"confirm", "7"},
                          R"({"detail": "The change 7 does not wait for a confirmation: it is done."})"),
              "What to do: 'veltctl history' tells the state of each change.\n");
    EXPECT_EQ(adviceAfter(undo, {"undo", "7"},
                          R"({"title": "The FTP port is taken", "code": 1903, "holder": "x", "changed": false,
                              "errors": [{"field": "/ftp/portnum", "expected": "a free port"}]})"),
              "What to do: Choose another port, or free this one.\n");
}

TEST_F(ExitCodesTest, AFailedRestartChangesNothing) {
    host.answerWith("POST /api/restart?sessions=keep",
                    problemReply(500, R"({"detail": "The FTP daemon does not start: no luck."})"));
    EXPECT_EQ(codeOf({"restart"}), 5);
    EXPECT_EQ(last.err.find("in effect"), std::string::npos) << last.err;
    EXPECT_NE(last.err.find("'veltctl status' shows what runs"), std::string::npos) << last.err;
}

TEST_F(ExitCodesTest, WhatIsWrongNeedNotBeTheInput) {
    host.answerWith(change, problemReply(422, R"({"title": "The settings cannot be like this", "code": 1902,
        "detail": "The key does not belong to the certificate. Nothing was changed.", "changed": false})"));
    EXPECT_EQ(codeOf({"ftp", "set", "portnum=2121"}), 3);
    EXPECT_EQ(last.err.find("Correct the input"), std::string::npos) << last.err;
    EXPECT_NE(last.err.find("veltctl doctor"), std::string::npos) << last.err;
}

TEST_F(ExitCodesTest, ThePlatformFailed) {
    EXPECT_EQ(codeAfter(500), 5);
    EXPECT_NE(last.err.find("request id r-1"), std::string::npos);
    EXPECT_NE(last.err.find("may be in effect"), std::string::npos);
    EXPECT_EQ(codeAfter(503), 5);
    host.answerWith(change, problemReply(500, R"({"title": "Failed", "changed": false})"));
    EXPECT_EQ(codeOf({"ftp", "set", "portnum=2121"}), 5);
    EXPECT_EQ(last.err.find("may be in effect"), std::string::npos) << last.err;
}

TEST_F(ExitCodesTest, AFailedReadChangesNothing) {
    const std::string sftpGet = "GET /api/VELT.Core.FileServ.FTP.SFTP/v1/get";
    for (const char* problem :
         {R"({"title": "Internal Server Error"})", R"({"title": "Failed", "code": 1902})"}) {
        host.answerWith(sftpGet, problemReply(500, problem));
        EXPECT_EQ(codeOf({"sftp", "get"}), 5);
        EXPECT_EQ(last.err.find("in effect"), std::string::npos) << last.err;
        EXPECT_NE(last.err.find("What to do: "), std::string::npos) << last.err;
    }
    // Some methods only read, and yet are called with POST.
    const std::string list = "POST /api/VELT.Core.FileServ.FTP.ChrootUser/v1/list";
    host.answerWith(list, problemReply(500, R"({"title": "Failed", "code": 1902})"));
    EXPECT_EQ(codeOf({"chroot", "users", "list"}), 5);
    EXPECT_EQ(last.err.find("in effect"), std::string::npos) << last.err;
}

TEST_F(ExitCodesTest, NoConnectionOrAccess) {
    EXPECT_EQ(codeAfter(401), 6);
    EXPECT_EQ(codeAfter(403), 6);
    EXPECT_EQ(codeAfter(408), 6);
    EXPECT_EQ(codeAfter(429), 6);
    EXPECT_EQ(codeAfter(302), 6);
    EXPECT_EQ(codeOf({"status", "--socket", folder.path("absent")}), 6);
}

TEST_F(ExitCodesTest, AFullOutputIsAnError) {
    const RunResult result = runProcess({"/bin/sh", "-c", "exec \"$0\" sftp get >/dev/full", VELTCTL},
                                        {"VELT_SOCKET=" + server.socketPath()});
    EXPECT_EQ(result.code, 1);
    EXPECT_NE(result.err.find("Cannot write the output"), std::string::npos) << result.err;
}

TEST_F(ExitCodesTest, AShareThatCannotBeReachedIsAConflictOfItsOwn) {
    host.answerWith(change, problemReply(409, R"({"title": "Not reachable", "code": 1905})"));
    EXPECT_EQ(codeOf({"security", "set", "anonymous_chroot=on"}), 4);
    EXPECT_NE(last.err.find("veltctl shares"), std::string::npos) << last.err;
}

TEST_F(ExitCodesTest, AProblemOfAnyFormIsReported) {
    for (const char* body : {"", "<html>", "[]", R"({"errors": 5, "title": {"a": 1}, "code": null})",
                             R"({"errors": [5, {"field": 7}]})"}) {
        host.answerWith(change, problemReply(422, body));
        EXPECT_EQ(codeOf({"ftp", "set", "portnum=1"}), 3) << body;
        EXPECT_NE(last.err.find("HTTP 422"), std::string::npos) << body;
    }
}
