#include "tests/cli/cli_test.h"

#include <chrono>
#include <csignal>
#include <thread>

#include <fcntl.h>
#include <poll.h>
#include <spawn.h>
#include <sys/wait.h>
#include <unistd.h>

namespace {

constexpr const char* stream =
    ": hello\n\n"
    "event: service\ndata: {\"service\": \"ftpd\", \"action\": \"start\"}\n\n"
    "event: log\ndata: {\"event\": \"0x11B00002\", \"text\": \"FTP on\", \"actor\": \"root\"}\n\n"
    "event: change\ndata: {\"way\": \"A v3 set\", \"id\": 4, \"actor\": "
    "\"root\", \"request_id\": \"r1\"}\n\n"
    "event: other\ndata: plain \x1b[31m\n\n";

class EventsTest : public CliTest {
protected:
    void answer(bool holdOpen, const std::string& query = "") {
        host.answerWith("GET /events" + query, HttpReply{200, stream, "text/event-stream", holdOpen, false});
    }
};

// A run of the built program that can be interrupted; its output comes through a pipe.
class RunningProgram {
public:
    explicit RunningProgram(const std::string& socket) {
        int ends[2] = {-1, -1};
        if (pipe2(ends, O_CLOEXEC) != 0) {
            throw std::runtime_error("cannot make a pipe");
        }
        posix_spawn_file_actions_t actions;
        posix_spawn_file_actions_init(&actions);
        posix_spawn_file_actions_adddup2(&actions, ends[1], STDOUT_FILENO);
        std::string program = VELTCTL;
        std::string command = "events";
        std::string variable = "VELT_SOCKET=" + socket;
        char* const arguments[] = {program.data(), command.data(), nullptr};
        char* const variables[] = {variable.data(), nullptr};
        const int error = posix_spawn(&child_, program.c_str(), &actions, nullptr, arguments, variables);
        posix_spawn_file_actions_destroy(&actions);
        close(ends[1]);
        output_ = ends[0];
        if (error != 0) {
            throw std::runtime_error("cannot start the program");
        }
    }
    ~RunningProgram() { close(output_); }
    RunningProgram(const RunningProgram&) = delete;
    RunningProgram& operator=(const RunningProgram&) = delete;

    // Everything up to the text, or what came in ten seconds.
    std::string readUntil(const std::string& text) const {
        std::string seen;
        pollfd waiting{output_, POLLIN, 0};
        while (seen.find(text) == std::string::npos && poll(&waiting, 1, 10000) == 1) {
            char buffer[1024];
            const ssize_t got = read(output_, buffer, sizeof buffer);
            if (got <= 0) {
                break;
            }
            seen.append(buffer, static_cast<std::size_t>(got));
        }
        return seen;
    }

    int interrupt() const {
        kill(child_, SIGINT);
        int status = 0;
        waitpid(child_, &status, 0);
        return WIFEXITED(status) ? WEXITSTATUS(status) : 128 + WTERMSIG(status);
    }

private:
    pid_t child_ = -1;
    int output_ = -1;
};

} // namespace

TEST_F(EventsTest, EachKindIsDescribedOnOneLine) {
    answer(true);
    const RunResult result = run({"events", "--count", "4"});
    EXPECT_EQ(result.code, 0) << result.err;
    for (const char* line : {"Z  service  ftpd: start\n", "Z  log  0x11B00002 FTP on (root)\n",
                             "Z  change  A v3 set by root (change 4)\n", "Z  other  plain \\x1b[31m\n"}) {
        EXPECT_NE(result.out.find(line), std::string::npos) << line << "\n" << result.out;
    }
}

TEST_F(EventsTest, OneKindIsShownAlone) {
    answer(true, "?kinds=log");
    answer(true, "?kinds=log,change");
    RunResult result = run({"events", "--count", "1", "--kind", "log"});
    EXPECT_EQ(result.code, 0) << result.err;
    EXPECT_NE(result.out.find("  log  0x11B00002"), std::string::npos) << result.out;
    EXPECT_EQ(result.out.find("service"), std::string::npos) << result.out;
    result = run({"events", "--count", "2", "--kind", "log,change"});
    EXPECT_NE(result.out.find("  change  "), std::string::npos) << result.out;
    EXPECT_EQ(run({"events", "--kind", "other"}).code, 2);
}

TEST_F(EventsTest, WhatUsersDoIsDescribed) {
    host.answerWith(
        "GET /events?kinds=session,transfer,operation",
        HttpReply{200,
                  "event: session\ndata: {\"action\": \"refused\", \"user\": \"anna\", \"address\": "
                  "\"192.0.2.1\", \"protocol\": \"sftp\", \"reason\": \"password\"}\n\n"
                  "event: transfer\ndata: {\"action\": \"progress\", \"operation\": \"upload\", "
                  "\"user\": \"anna\", \"address\": \"192.0.2.1\", \"protocol\": \"ftps\", \"path\": "
                  "\"/a b\", \"octets\": 25000000, \"rate\": 1500}\n\n"
                  "event: operation\ndata: {\"operation\": \"rename\", \"result\": \"done\", "
                  "\"user\": \"anna\", \"address\": \"192.0.2.1\", \"protocol\": \"ftp\", \"path\": "
                  "\"/a\", \"new_path\": \"/b\"}\n\n",
                  "text/event-stream", true, false});
    const RunResult result = run({"events", "--count", "3", "--kind", "session,transfer,operation"});
    EXPECT_EQ(result.code, 0) << result.err;
    for (const char* line :
         {"Z  session  refused: anna from 192.0.2.1 by sftp (password)\n",
          "Z  transfer  upload progress: /a b of anna from 192.0.2.1 by ftps, 25 MB, 1.5 KB/s\n",
          "Z  operation  rename done: /a -> /b of anna from 192.0.2.1 by ftp\n"}) {
        EXPECT_NE(result.out.find(line), std::string::npos) << line << "\n" << result.out;
    }
}

TEST_F(EventsTest, ProgramsGetOneObjectPerLine) {
    answer(true);
    const RunResult result = run({"events", "--count", "1", "--json"});
    EXPECT_EQ(result.code, 0);
    EXPECT_EQ(result.out.find('\n'), result.out.size() - 1);
    EXPECT_EQ(jsonOf(result.out),
              jsonOf(R"({"event": "service", "data": {"service": "ftpd", "action": "start"}})"));
}

TEST_F(EventsTest, AnInterruptionEndsTheCommandWithSuccess) {
    answer(true);
    interrupted = true;
    EXPECT_EQ(run({"events"}).code, 0);
    EXPECT_GT(interruptionsAsked, 0);
}

TEST_F(EventsTest, TheInterruptedProgramLeavesWithZero) {
    answer(true);
    const RunningProgram program(server.socketPath());
    EXPECT_NE(program.readUntil("ftpd: start").find("ftpd: start"), std::string::npos);
    EXPECT_EQ(program.interrupt(), 0);
}

TEST_F(EventsTest, AStreamThatTheServerClosesIsAnError) {
    answer(false);
    const RunResult result = run({"events"});
    EXPECT_EQ(result.code, 6);
    EXPECT_NE(result.out.find("ftpd: start"), std::string::npos);
    EXPECT_NE(result.err.find("closed the stream"), std::string::npos);
}

TEST_F(EventsTest, ARefusedStreamIsAnError) {
    host.answerWith("GET /events", problemReply(401, R"({"title": "Who asks?"})"));
    const RunResult result = run({"events"});
    EXPECT_EQ(result.code, 6);
    EXPECT_EQ(result.out, "");
    EXPECT_NE(result.err.find("Who asks?"), std::string::npos);
}
