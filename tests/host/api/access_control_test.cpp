// Who may talk to the host.

#include "tests/host/fake_standalone.h"
#include "tests/host/host_test.h"
#include "tests/support/fake_platform/fake_platform.h"

#include <grp.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <chrono>
#include <thread>

namespace {

const std::string sftp = "/api/VELT.Core.FileServ.FTP.SFTP/v1/";
const std::vector<std::string> everyPath{"/",
                                         "/api",
                                         "/api/health",
                                         "/api/status",
                                         "/api/log",
                                         "/api/bans",
                                         "/api/bans/192.0.2.1",
                                         "/api/tokens",
                                         "/api/tokens/1",
                                         "/metrics",
                                         "/openapi.json",
                                         "/events",
                                         sftp + "get",
                                         sftp + "set",
                                         "/nowhere",
                                         "/api/VELT.None/v1/get"};

class HostAccess : public HostTest {
protected:
    void SetUp() override {
        fake::Platform::instance().reset();
        FakeStandalone::instance() = {};
        settings.workers = 1;
    }

    /// The answer to a request over the Unix socket from a thread with other credentials.
    Answer askAs(uid_t uid, gid_t gid, const std::vector<gid_t>& groups, const std::string& request) const {
        chmod(folder.c_str(), 0755);
        chmod(socketPath.c_str(), 0666);
        Answer answer;
        // The system calls, unlike the library's functions, change this thread alone.
        std::thread([&] {
            syscall(SYS_setgroups, groups.size(), groups.data());
            syscall(SYS_setresgid, gid, gid, gid);
            syscall(SYS_setresuid, uid, uid, uid);
            Client client = Client::unixSocket(socketPath);
            answer = client.ask(request);
        }).join();
        return answer;
    }
};

TEST_F(HostAccess, WithoutATokenNothingGoesFurtherThan401) {
    start();
    for (const std::string& path : everyPath) {
        for (const char* method : {"GET", "POST", "PUT", "DELETE", "OPTIONS", "BREW"}) {
            for (const char* body : {"", "{}", "no JSON"}) {
                const Answer answer = ask(method, path, "", body);
                EXPECT_EQ(answer.status, 401) << method << " " << path << " " << body;
                EXPECT_EQ(answer.header("www-authenticate"), "Bearer");
            }
        }
    }
    EXPECT_EQ(fake::Platform::instance().count("VELTSFTPConfigGet"), 0);
}

TEST_F(HostAccess, ABodyTooLargeWithoutATokenIs401) {
    start();
    Client client = connect();
    EXPECT_EQ(client.ask("POST /api HTTP/1.1\r\nHost: localhost\r\nContent-Length: 99999999\r\n\r\n").status,
              401);
}

TEST_F(HostAccess, ARequestThatIsWrongInItselfIs401WithoutAToken) {
    start();
    const std::string host = "Host: localhost\r\n";
    for (const std::string& text : std::vector<std::string>{
             "CONNECT localhost:22 HTTP/1.1\r\n" + host + "\r\n",
             "OPTIONS * HTTP/1.1\r\n" + host + "\r\n",
             "TRACE /api HTTP/1.1\r\n" + host + "\r\n",
             "HEAD /api HTTP/1.1\r\n" + host + "\r\n",
             "GET http://localhost/api/status HTTP/1.1\r\n" + host + "\r\n",
             "GET /%zz HTTP/1.1\r\n" + host + "\r\n",
             "GET /../../etc/passwd HTTP/1.1\r\n" + host + "\r\n",
             "GET /api/status HTTP/1.1\r\n\r\n",
             "GET /api/status HTTP/1.1\r\n" + host + host + "\r\n",
             "GET /api/status HTTP/1.1\r\nHost: evil.example\r\n\r\n",
             "GET /api/status HTTP/1.1\r\nOrigin: http://evil.example\r\n" + host + "\r\n",
             "POST " + sftp + "set HTTP/1.1\r\nTransfer-Encoding: gzip\r\n" + host + "\r\n",
             "POST " + sftp + "set HTTP/1.1\r\nTransfer-Encoding: chunked\r\n" + host + "\r\nnone\r\n",
             "POST " + sftp + "set HTTP/1.1\r\nContent-Length: 99999999\r\nExpect: 100-continue\r\n" + host +
                 "\r\n",
             requestText("POST", sftp + "set", "Content-Type: text/plain\r\n", "{\"enable\":"),
             "GET /api/status HTTP/1.0\r\n" + host + "\r\n",
         }) {
        Client client = connect();
        client.send(text);
        const Answer answer = client.receive(!text.starts_with("HEAD"));
        EXPECT_EQ(answer.status, 401) << text;
        EXPECT_EQ(answer.header("connection"), "close") << text;
    }
}

TEST_F(HostAccess, WhatFollowsARefusedRequestIsNotServed) {
    start();
    Client client = connect();
    client.send(requestText("GET", "/api/status") +
                requestText("POST", sftp + "set", admin, R"({"enable":true})"));
    EXPECT_EQ(client.receive().status, 401);
    EXPECT_EQ(client.receive().status, 0);
    EXPECT_EQ(fake::Platform::instance().count("VELTSFTPConfigSet"), 0);
}

TEST_F(HostAccess, EachRequestOfAConnectionShowsItsToken) {
    start();
    Client client = connect();
    EXPECT_EQ(client.ask(requestText("GET", "/api/status", admin)).status, 200);
    EXPECT_EQ(client.ask(requestText("GET", "/api/status")).status, 401);
    EXPECT_TRUE(client.ended());
}

TEST_F(HostAccess, WrongTokensAreRefusedAndLogged) {
    start();
    const std::string good = admin.substr(0, admin.size() - 2);
    for (const std::string& header :
         {std::string("Authorization: Bearer wrong"), std::string("Authorization: Bearer "), good + "0",
          good.substr(0, good.size() - 1), std::string("Authorization: Basic dXNlcjpwYXNz"),
          good + "\r\n" + good}) {
        EXPECT_EQ(ask("GET", sftp + "get", header + "\r\n").status, 401) << header;
    }
    EXPECT_TRUE(logged("access refused (401) to 127.0.0.1: The token is not valid."));
}

TEST_F(HostAccess, ManyRefusalsAreCountedAndNotWritten) {
    start();
    const auto refusals = [this](std::size_t count) {
        const std::string text = requestText("GET", "/api/status");
        for (std::size_t i = 0; i < count; ++i) {
            Client client = connect();
            EXPECT_EQ(client.ask(i % 2 == 0 ? text : "NONSENSE\r\n\r\n").status, i % 2 == 0 ? 401 : 400);
        }
    };
    const auto begin = std::chrono::steady_clock::now();
    refusals(300);
    const auto seconds =
        std::chrono::duration_cast<std::chrono::seconds>(std::chrono::steady_clock::now() - begin);
    std::this_thread::sleep_for(std::chrono::milliseconds(1100));
    refusals(1);
    std::size_t written = 0;
    std::size_t leftOut = 0;
    for (const std::string& line : logLines()) {
        written += line.find("access refused (401)") != std::string::npos ||
                   line.find("400 The request is not well-formed") != std::string::npos;
        leftOut += line.find(" refusals before the next line are not logged") != std::string::npos
                       ? std::stoul(line)
                       : 0;
    }
    EXPECT_EQ(written + leftOut, 301U);
    EXPECT_LE(written, 10U * (static_cast<std::size_t>(seconds.count()) + 2) + 1);
    EXPECT_GE(leftOut, 1U);
}

TEST_F(HostAccess, AWrongTokenWaitsForItsAnswer) {
    limits.refusalDelay = std::chrono::milliseconds(300);
    start();
    const auto begin = std::chrono::steady_clock::now();
    EXPECT_EQ(ask("GET", "/api", "Authorization: Bearer wrong\r\n").status, 401);
    EXPECT_GE(std::chrono::steady_clock::now() - begin, std::chrono::milliseconds(300));
}

// Guessing stays slow, however often it was tried.
TEST_F(HostAccess, ThePlacesOfThoseWhoWaitedAreFreeAgain) {
    limits.delayedRefusals = 1;
    limits.refusalDelay = std::chrono::milliseconds(100);
    start();
    for (int i = 0; i < 3; ++i) {
        const auto begin = std::chrono::steady_clock::now();
        EXPECT_EQ(ask("GET", "/api", "Authorization: Bearer wrong\r\n").status, 401);
        EXPECT_GE(std::chrono::steady_clock::now() - begin, std::chrono::milliseconds(100));
    }
}

TEST_F(HostAccess, ViewersRead) {
    start();
    for (const std::string& path :
         {sftp + "get", std::string("/api"), std::string("/api/status"), std::string("/api/log"),
          std::string("/metrics"), std::string("/api/status")}) {
        EXPECT_EQ(ask("GET", path, viewer).status, 200) << path;
    }
    const std::string list = "/api/VELT.Core.FileServ.FTP.ChrootUser/v1/list";
    EXPECT_EQ(ask("POST", list, viewer, R"({"chroot":true})").status, 200);
}

TEST_F(HostAccess, ViewersChangeNothing) {
    start();
    EXPECT_EQ(ask("POST", sftp + "set", viewer, R"({"enable":true})").status, 403);
    EXPECT_EQ(ask("POST", sftp + "set", viewer, "no JSON").status, 403);
    EXPECT_EQ(ask("GET", "/api/tokens", viewer).status, 403);
    EXPECT_EQ(ask("POST", "/api/tokens", viewer, R"({"name":"x","role":"admin"})").status, 403);
    EXPECT_EQ(ask("DELETE", "/api/tokens/1", viewer).status, 403);
    EXPECT_EQ(fake::Platform::instance().count("VELTSFTPConfigSet"), 0);
}

TEST_F(HostAccess, TheHostMustBeThisOne) {
    settings.access.hostNames = {"nas.example"};
    start();
    const auto askFor = [this](const std::string& host) {
        Client client = connect();
        return client.ask("GET /api/status HTTP/1.1\r\nHost: " + host + "\r\n" + admin + "\r\n").status;
    };
    const std::string real = ":" + std::to_string(port);
    for (const std::string& host : {std::string("localhost"), "localhost" + real, "127.0.0.1" + real,
                                    "[::1]" + real, "NAS.example" + real, std::string("LOCALHOST")}) {
        EXPECT_EQ(askFor(host), 200) << host;
    }
    for (const std::string& host :
         {std::string("evil.example"), "evil.example" + real, std::string("localhost:1"),
          std::string("localhost.evil.example"), std::string("127.0.0.1.evil.example"),
          std::string("10.0.0.1"), std::string("[::1"), std::string("")}) {
        EXPECT_EQ(askFor(host), 403) << host;
    }
    for (const char* host : {"[::1]x", "[::1]80", "[::1]]", "[::1]x:80"}) {
        EXPECT_EQ(askFor(host), 400) << host;
    }
}

TEST_F(HostAccess, PagesOfAnotherOriginAreRefused) {
    start();
    EXPECT_EQ(ask("GET", "/api/status", admin + "Origin: http://localhost\r\n").status, 200);
    EXPECT_EQ(ask("GET", "/api/status", admin + "Sec-Fetch-Site: same-origin\r\n").status, 200);
    EXPECT_EQ(ask("GET", "/api/status", admin + "Sec-Fetch-Site: none\r\n").status, 200);
    for (const char* header : {"Origin: http://evil.example\r\n", "Origin: null\r\n",
                               "Origin: https://localhost\r\n", "Origin: http://localhost:1\r\n",
                               "Sec-Fetch-Site: cross-site\r\n", "Sec-Fetch-Site: same-site\r\n"}) {
        EXPECT_EQ(ask("GET", "/api/status", admin + header).status, 403) << header;
    }
    Client local = Client::unixSocket(socketPath);
    EXPECT_EQ(local.ask(requestText("GET", "/api/status", "Origin: http://evil.example\r\n")).status, 403);
}

TEST_F(HostAccess, RootIsAdminOnTheUnixSocket) {
    start();
    Client client = Client::unixSocket(socketPath);
    EXPECT_EQ(client.ask(requestText("POST", sftp + "set", "", R"({"enable":true})")).status, 204);
    EXPECT_EQ(FakeStandalone::instance().address, "local");
    EXPECT_EQ(client.ask(requestText("GET", "/api/status", "Authorization: Bearer wrong\r\n")).status, 401)
        << "a token that is shown is looked at";
}

TEST_F(HostAccess, OthersOnTheUnixSocketNeedTheGroup) {
    if (geteuid() != 0) {
        GTEST_SKIP() << "only root can be somebody else";
    }
    const group* const known = getgrnam("daemon"); // NOLINT(concurrency-mt-unsafe)
    ASSERT_NE(known, nullptr);
    const gid_t admins = known->gr_gid;
    settings.access.adminGroup = "daemon";
    start();
    constexpr uid_t nobody = 65534;
    const std::string request = requestText("GET", sftp + "get");
    EXPECT_EQ(askAs(nobody, nobody, {}, request).status, 403);
    EXPECT_EQ(askAs(nobody, nobody, {nobody, 12345}, request).status, 403);
    EXPECT_EQ(askAs(nobody, nobody, {admins}, request).status, 200);
    EXPECT_EQ(askAs(nobody, admins, {}, request).status, 200);
    EXPECT_EQ(askAs(nobody, nobody, {}, requestText("GET", sftp + "get", viewer)).status, 200);
    EXPECT_EQ(askAs(nobody, nobody, {}, requestText("POST", sftp + "set", viewer, "{}")).status, 403);
}

TEST_F(HostAccess, WithoutTheGroupOnlyRootIsAdmin) {
    if (geteuid() != 0) {
        GTEST_SKIP() << "only root can be somebody else";
    }
    settings.access.adminGroup = "no-such-group";
    start();
    const std::string request = requestText("GET", sftp + "get");
    EXPECT_EQ(askAs(65534, 65534, {0, 1, 65534}, request).status, 403);
    EXPECT_EQ(Client::unixSocket(socketPath).ask(request).status, 200);
}

TEST_F(HostAccess, TheUnixSocketIsClosedToOthers) {
    start();
    struct stat status {};
    ASSERT_EQ(stat(socketPath.c_str(), &status), 0);
    EXPECT_EQ(status.st_mode & 0777U, 0660U);
}

} // namespace
