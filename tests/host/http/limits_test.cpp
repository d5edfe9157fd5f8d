// Requests that are too large, too slow or too many.

#include "host/base/open_file_limit.h"
#include "tests/host/fake_standalone.h"
#include "tests/host/host_test.h"
#include "tests/support/fake_platform/fake_platform.h"
#include "tests/support/waiting.h"

#include <sys/resource.h>
#include <unistd.h>

#include <algorithm>
#include <concepts>
#include <deque>
#include <thread>

namespace {

using std::chrono::milliseconds;
using std::chrono::seconds;
using velt::test::Clock;

const std::string target = "/api/VELT.Core.FileServ.FTP.SFTP/v1/";

/// How long it takes when nothing else delays it: the shortest of several times.
template<std::invocable Work> milliseconds shortestTimeOf(const Work& work) {
    milliseconds shortest = milliseconds::max();
    for (int i = 0; i < 5; ++i) {
        shortest = std::min(shortest, velt::test::timeOf(work));
    }
    return shortest;
}

class HostLimits : public HostTest {
protected:
    void SetUp() override {
        fake::Platform::instance().reset();
        FakeStandalone::instance() = {};
        settings.workers = 1;
    }
};

TEST_F(HostLimits, AHeadMayBeAsLargeAsTheLimit) {
    start();
    const std::string small = requestText("GET", "/healthz", admin + "X-Pad: \r\n");
    const std::size_t room = limits.head - small.size();
    const auto padded = [this](std::size_t size) {
        Client client = connect();
        return client.ask(
            requestText("GET", "/healthz", admin + "X-Pad: " + std::string(size, 'a') + "\r\n"));
    };
    EXPECT_EQ(padded(room).status, 200);
    EXPECT_EQ(padded(room + 1).status, 431);
}

TEST_F(HostLimits, AHugeHeadIsRefusedAlthoughItGoesOn) {
    start();
    Client client = connect();
    client.send("GET /healthz HTTP/1.1\r\n");
    const std::string line = "X-Pad: " + std::string(1000, 'a') + "\r\n";
    for (int i = 0; i < 200 && client.send(line); ++i) {
    }
    EXPECT_EQ(client.receive().status, 431);
    EXPECT_TRUE(client.ended());
}

TEST_F(HostLimits, ABodyMayBeAsLargeAsTheLimit) {
    start();
    const std::string rules = "/api/VELT.Core.FileServ.FTP.ChrootUser/v2/save";
    const std::string json = R"({"rules":[]})";
    EXPECT_EQ(post(rules, json + std::string(limits.body - json.size(), ' ')).status, 204);
    const Answer large = post(rules, json + std::string(limits.body - json.size() + 1, ' '));
    EXPECT_EQ(large.status, 413);
    EXPECT_EQ(large.header("content-type"), "application/problem+json");
}

TEST_F(HostLimits, OnlyTheListsOfAdminsAreLarge) {
    start();
    constexpr std::size_t most = std::size_t{64} * 1024;
    const std::string json = R"({"enable":true})";
    const std::string usual = json + std::string(most - json.size(), ' ');
    EXPECT_EQ(post(target + "set", usual).status, 204);
    const Answer large = post(target + "set", usual + " ");
    EXPECT_EQ(large.status, 413);
    EXPECT_EQ(large.json()["detail"], "The body is larger than 65536 bytes.");
    EXPECT_EQ(post("/api/tokens", usual + " ").status, 413);
    EXPECT_EQ(post(target + "get", usual + " ").status, 413);
    EXPECT_EQ(ask("POST", target + "get", viewer, usual).status, 200);
    const std::string chroot = "/api/VELT.Core.FileServ.FTP.ChrootUser/";
    for (const char* method : {"v1/add", "v1/delete", "v2/save"}) {
        EXPECT_NE(post(chroot + method, usual + " ").status, 413) << method;
        EXPECT_EQ(ask("POST", chroot + method, viewer, usual + " ").status, 413) << method;
    }
    Client chunked = connect();
    const std::string head = "POST " + target + "get HTTP/1.1\r\nHost: localhost\r\n" + viewer;
    chunked.send(head + "Transfer-Encoding: chunked\r\n\r\n10000\r\n" + usual + "\r\n1\r\n \r\n0\r\n\r\n");
    EXPECT_EQ(chunked.receive().status, 413);
    Client patient = connect();
    const std::string wish = "Expect: 100-continue\r\nContent-Length: ";
    EXPECT_EQ(patient.ask(head + wish + "65537\r\n\r\n").status, 413) << "before the body is sent";
    Client next = connect();
    EXPECT_EQ(next.ask(head + wish + "65536\r\n\r\n").status, 100);
}

TEST_F(HostLimits, AHugeChunkedBodyIsRefused) {
    limits.body = 10'000;
    start();
    Client client = connect();
    client.send("POST " + target + "set HTTP/1.1\r\nHost: localhost\r\n" + admin +
                "Transfer-Encoding: chunked\r\n\r\n");
    const std::string chunk = "3e8\r\n" + std::string(1000, ' ') + "\r\n";
    for (int i = 0; i < 100 && client.send(chunk); ++i) {
    }
    EXPECT_EQ(client.receive().status, 413);
}

TEST_F(HostLimits, ASlowHeadTimesOut) {
    limits.headTime = milliseconds(200);
    start();
    Client client = connect();
    client.send("GET /healthz HTTP/1.1\r\nHost: ");
    const Answer answer = client.receive();
    EXPECT_EQ(answer.status, 408);
    EXPECT_EQ(answer.json()["status"], 408);
    EXPECT_TRUE(client.ended());
}

TEST_F(HostLimits, ATrickledHeadTimesOut) {
    limits.headTime = milliseconds(300);
    start();
    Client client = connect();
    // It would go on for 40 s.
    int sent = 0;
    while (sent < 2000 && client.send("G")) {
        ++sent;
        std::this_thread::sleep_for(milliseconds(20));
    }
    EXPECT_LT(sent, 2000);
    EXPECT_EQ(client.receive().status, 408);
}

TEST_F(HostLimits, ASlowBodyTimesOut) {
    limits.bodyTime = milliseconds(200);
    start();
    Client client = connect();
    client.send("POST " + target + "set HTTP/1.1\r\nHost: localhost\r\n" + admin +
                "Content-Length: 100\r\n\r\n{");
    EXPECT_EQ(client.receive().status, 408);
    EXPECT_TRUE(client.ended());
}

TEST_F(HostLimits, AnIdleConnectionEndsWithoutAnAnswer) {
    limits.idleTime = milliseconds(200);
    start();
    Client fresh = connect();
    EXPECT_EQ(fresh.receive().status, 0);
    Client used = connect();
    EXPECT_EQ(used.ask(requestText("GET", "/healthz", admin)).status, 200);
    EXPECT_EQ(used.receive().status, 0);
}

TEST_F(HostLimits, AClientThatTakesNoAnswersIsLeft) {
    limits.writeTime = milliseconds(300);
    start();
    const Client client = connect();
    const std::string request = requestText("GET", "/openapi.json", admin);
    // Their answers do not fit into the buffers between the two.
    for (int i = 0; i < 300; ++i) {
        if (!client.send(request)) {
            break;
        }
    }
    for (int i = 0; i < 500 && server->connections() > 0; ++i) {
        std::this_thread::sleep_for(milliseconds(10));
    }
    EXPECT_EQ(server->connections(), 0U);
}

TEST_F(HostLimits, ConnectionsBeyondTheLimitAreToldSo) {
    limits.connections = 5;
    start();
    std::deque<Client> open;
    while (server->connections() > 0) {
        std::this_thread::sleep_for(milliseconds(5));
    }
    for (int i = 0; i < 5; ++i) {
        open.push_back(connect());
        EXPECT_EQ(open.back().ask(requestText("GET", "/healthz", admin)).status, 200);
    }
    Client more = connect();
    EXPECT_EQ(more.receive().status, 503);
    EXPECT_TRUE(more.ended());
    open.pop_front();
    Answer answer;
    for (int i = 0; i < 200 && answer.status != 200; ++i) {
        std::this_thread::sleep_for(milliseconds(10));
        answer = get("/healthz");
    }
    EXPECT_EQ(answer.status, 200);
}

TEST_F(HostLimits, OneTokenLocksOutNobody) {
    ASSERT_EQ(velt::host::makeRoomForConnections(3000), 3000U) << "the test needs more descriptors";
    start();
    const auto askAsRoot = [this] {
        Client root = Client::unixSocket(socketPath);
        EXPECT_EQ(root.ask(requestText("GET", target + "get")).status, 200);
    };
    const auto alone = shortestTimeOf(askAsRoot);
    std::deque<Client> open;
    for (int i = 0; i < 1000; ++i) {
        open.push_back(connect());
        open.back().send(requestText("GET", "/events", viewer));
    }
    for (int i = 0; i < 1064; ++i) {
        open.push_back(connect());
        open.back().send("POST " + target + "get HTTP/1.1\r\nHost: localhost\r\n" + viewer +
                         "Content-Length: 100\r\n\r\n{");
    }
    EXPECT_EQ(open.back().receive().status, 429) << "all before it have been heard";
    EXPECT_LT(shortestTimeOf(askAsRoot), 10 * alone + milliseconds(50));
    EXPECT_EQ(get("/healthz").status, 200) << "another token";
}

TEST_F(HostLimits, AClientHasAShareOfTheConnections) {
    limits.connectionsOfOne = 3;
    limits.eventStreamsOfOne = 2;
    start();
    std::deque<Client> open;
    for (int i = 0; i < 2; ++i) {
        open.push_back(connect());
        open.back().send(requestText("GET", "/events", viewer));
        EXPECT_NE(open.back().readUntil(": connected\n\n"), "");
    }
    open.push_back(connect());
    EXPECT_EQ(open.back().ask(requestText("GET", "/events", viewer)).status, 429);
    EXPECT_EQ(open.back().ask(requestText("GET", "/healthz", viewer)).status, 200) << "not a stream";
    EXPECT_EQ(ask("GET", "/healthz", viewer).status, 429) << "the fourth connection";
    EXPECT_EQ(open.back().ask(requestText("GET", "/healthz", admin)).status, 200) << "another token";
    EXPECT_EQ(ask("GET", "/healthz", viewer).status, 200) << "its place is free";
    open.clear();
    const auto streamsAgain = [this] {
        Client client = connect();
        client.send(requestText("GET", "/events", viewer));
        return client.receive(false).status == 200;
    };
    bool again = false;
    for (int i = 0; i < 200 && !again; ++i) {
        std::this_thread::sleep_for(milliseconds(10));
        again = streamsAgain();
    }
    EXPECT_TRUE(again);
}

TEST_F(HostLimits, RootIsServedAlthoughAllConnectionsAreInUse) {
    if (geteuid() != 0) {
        GTEST_SKIP() << "only root is let in without the group";
    }
    limits.connections = 5;
    start();
    Client early = Client::unixSocket(socketPath);
    std::deque<Client> open;
    for (int i = 0; i < 100; ++i) {
        open.push_back(connect());
        open.back().send(requestText("GET", "/events", admin));
    }
    EXPECT_EQ(early.ask(requestText("GET", "/healthz")).status, 200) << "it does not give way";
    Client root = Client::unixSocket(socketPath);
    EXPECT_EQ(root.ask(requestText("GET", "/healthz")).status, 200);
}

TEST_F(HostLimits, WhoOnlyConnectsGivesWay) {
    limits.connections = 5;
    start();
    Client trusted = connect();
    EXPECT_EQ(trusted.ask(requestText("GET", "/healthz", admin)).status, 200);
    std::deque<Client> idle;
    for (int i = 0; i < 20; ++i) {
        idle.push_back(connect());
        idle.back().send(i % 2 == 0 ? "" : "GET /heal");
    }
    EXPECT_EQ(get("/healthz").status, 200);
    EXPECT_TRUE(idle.front().ended()) << "the oldest goes first";
    EXPECT_EQ(idle.back().ask("thz HTTP/1.1\r\nHost: localhost\r\n" + admin + "\r\n").status, 200);
    EXPECT_EQ(trusted.ask(requestText("GET", "/healthz", admin)).status, 200) << "one with access stays";
    EXPECT_LE(server->connections(), 6U);
}

TEST_F(HostLimits, ManyWrongTokensKeepNobodyOut) {
    limits.connections = 100;
    limits.delayedRefusals = 10;
    limits.refusalDelay = seconds(3);
    start();
    const auto begin = Clock::now();
    std::deque<Client> guesses;
    for (int i = 0; i < 300; ++i) {
        guesses.push_back(connect());
        guesses.back().send(requestText("GET", "/healthz", "Authorization: Bearer guess\r\n"));
    }
    const auto asked = Clock::now();
    EXPECT_EQ(get("/healthz").status, 200);
    EXPECT_LT(Clock::now() - asked, limits.refusalDelay) << "it does not wait for those that wait";
    int refused = 0;
    for (Client& guess : guesses) {
        const int status = guess.receive().status;
        EXPECT_TRUE(status == 401 || status == 0) << status;
        refused += status == 401;
    }
    EXPECT_GE(refused, 100) << "who gave way got no answer, the others did";
    EXPECT_GE(Clock::now() - begin, limits.refusalDelay) << "those that wait do wait";
}

TEST_F(HostLimits, AThousandIdleConnectionsBlockNobody) {
    // Of this test there are as many descriptors as of the host.
    ASSERT_EQ(velt::host::makeRoomForConnections(2000), 2000U) << "the test needs more descriptors";
    limits.connections = 1010;
    limits.headTime = seconds(100);
    limits.idleTime = seconds(100);
    start();
    const auto askOften = [this] {
        Client client = connect();
        for (int i = 0; i < 20; ++i) {
            ASSERT_EQ(client.ask(requestText("GET", target + "get", admin)).status, 200);
        }
    };
    const auto alone = shortestTimeOf(askOften);
    std::deque<Client> idle;
    for (int i = 0; i < 1000; ++i) {
        idle.push_back(connect());
        ASSERT_TRUE(idle.back().connected());
        // Half of them have begun a request.
        if (i % 2 == 0) {
            idle.back().send("GET /heal");
        }
    }
    EXPECT_LT(shortestTimeOf(askOften), 10 * alone + milliseconds(50));
    EXPECT_EQ(idle[0].ask("thz HTTP/1.1\r\nHost: localhost\r\n" + admin + "\r\n").status, 200);
    const auto end = Clock::now();
    stop();
    EXPECT_LT(Clock::now() - end, seconds(10)) << "whoever is idle is not waited for";
}

/// Never returns: a hard limit that was lowered does not rise again.
[[noreturn]] void tryTightLimits() {
    const rlimit tight = {100, 1000};
    setrlimit(RLIMIT_NOFILE, &tight);
    const bool small = velt::host::makeRoomForConnections(500) == 500;
    const bool large = velt::host::makeRoomForConnections(5000) == 1000 - 256;
    rlimit now{};
    getrlimit(RLIMIT_NOFILE, &now);
    _exit(small && large && now.rlim_cur == 1000 ? 0 : 1);
}

TEST(Descriptors, AreAsManyAsTheLimitAllows) {
    EXPECT_EXIT(tryTightLimits(), testing::ExitedWithCode(0), "");
}

} // namespace
