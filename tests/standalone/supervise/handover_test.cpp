// A daemon that gives way to a successor on its own port, under velt-supervise.
#include "standalone/control/supervised_daemon.h"
#include "standalone/core/state_root.h"
#include "standalone/process/listening_sockets.h"
#include "standalone/process/shared_port.h"
#include "tests/standalone/supervise/daemon_test.h"
#include "tests/support/ports.h"
#include "tests/support/result.h"
#include "tests/support/waiting.h"

#include <algorithm>
#include <csignal>
#include <filesystem>
#include <iterator>
#include <memory>
#include <string>
#include <thread>
#include <vector>

namespace velt::test {
namespace {

using std::chrono::milliseconds;
using std::chrono::seconds;

class HandOverTest : public DaemonTest {
protected:
    void TearDown() override {
        EXPECT_EQ(messageOf(ftp_.stop()), "");
        DaemonTest::TearDown();
    }

    /// What became of the sessions.
    SessionCount start(const std::string& hash, bool endSessions = false,
                       std::vector<std::string> options = {"--share"}) {
        const auto started = ftp_.start(testOrder(port_, hash, options), endSessions);
        EXPECT_EQ(messageOf(started), "");
        return started.valueOr({});
    }

    static std::size_t filesOf(const ProcessId& process) {
        const auto files =
            std::filesystem::directory_iterator("/proc/" + std::to_string(process.pid) + "/fd");
        return static_cast<std::size_t>(std::distance(begin(files), end(files)));
    }

    static std::size_t filesIn(const std::filesystem::path& folder) {
        const auto files = std::filesystem::recursive_directory_iterator(folder);
        return static_cast<std::size_t>(std::distance(begin(files), end(files)));
    }

    static std::size_t listenersOn(int port) {
        const auto sockets = listeningSockets().valueOr({});
        return static_cast<std::size_t>(std::ranges::count(sockets, port, &ListeningSocket::port));
    }

    SupervisedDaemon ftp_{ftpDaemon};
    int port_ = freePort();
};

TEST_F(HandOverTest, SessionsGoOnWithTheirFormerDaemonGone) {
    start("one");
    const ProcessId former = daemonState(ftpDaemon).daemon;
    Client client(port_);
    ASSERT_TRUE(client.isServed());
    EXPECT_EQ(start("two"), (SessionCount{0, 1}));
    EXPECT_NE(daemonState(ftpDaemon).daemon, former);
    EXPECT_EQ(daemonState(ftpDaemon).configurationHash, "two");
    EXPECT_TRUE(waitUntil([&] { return !isAlive(former); }, patience));
    EXPECT_EQ(listenersOn(port_), 1U);
    EXPECT_TRUE(client.isServed());
    EXPECT_TRUE(Client(port_).isServed());
}

TEST_F(HandOverTest, ADaemonThatIsStuckIsRenewedThoughNothingChanged) {
    start("one");
    const ProcessId former = daemonState(ftpDaemon).daemon;
    Client client(port_);
    ASSERT_TRUE(client.isServed());
    EXPECT_EQ(start("one"), SessionCount());
    EXPECT_EQ(daemonState(ftpDaemon).daemon, former);
    signalProcess(former, SIGSTOP);
    DaemonOrder order = testOrder(port_, "one", {"--share"});
    order.renew = true;
    EXPECT_EQ(ftp_.start(order, false).valueOr({}), (SessionCount{0, 1}));
    EXPECT_NE(daemonState(ftpDaemon).daemon, former);
    EXPECT_TRUE(Client(port_).isServed());
    EXPECT_TRUE(client.isServed());
    EXPECT_TRUE(waitUntil([&] { return !isAlive(former); }, patience));
    EXPECT_EQ(start("one"), SessionCount()) << "the next order is none to renew";
}

TEST_F(HandOverTest, AFormerDaemonThatStaysForAMomentIsNoSession) {
    start("one");
    const ProcessId former = daemonState(ftpDaemon).daemon;
    Client client(port_);
    ASSERT_TRUE(client.isServed());
    start("two");
    const auto sessions = sessionsOf(daemonState(ftpDaemon));
    ASSERT_TRUE(isAlive(former)) << "it stays for those who began to connect";
    EXPECT_EQ(sessions.size(), 1U);
    EXPECT_TRUE(waitUntil([&] { return !isAlive(former); }, patience));
    EXPECT_EQ(sessionsOf(daemonState(ftpDaemon)), sessions);
}

TEST_F(HandOverTest, SessionsOfAllFormerDaemonsEndWithAStop) {
    std::vector<std::unique_ptr<Client>> clients;
    for (const char* hash : {"one", "two", "three", "four"}) {
        start(hash);
        clients.push_back(std::make_unique<Client>(port_));
        ASSERT_TRUE(clients.back()->isServed());
    }
    for (const auto& client : clients) {
        EXPECT_TRUE(client->isServed());
    }
    const auto stopped = ftp_.stop();
    ASSERT_EQ(messageOf(stopped), "");
    EXPECT_EQ(*stopped, (SessionCount{4, 0}));
    for (const auto& client : clients) {
        EXPECT_FALSE(client->isServed());
    }
    EXPECT_TRUE(leftProcesses().empty());
}

TEST_F(HandOverTest, SessionsEndWhereTheyAreToEnd) {
    start("one");
    Client first(port_);
    ASSERT_TRUE(first.isServed());
    start("two");
    Client second(port_);
    ASSERT_TRUE(second.isServed());
    EXPECT_EQ(start("three", true), (SessionCount{2, 0}));
    EXPECT_FALSE(first.isServed());
    EXPECT_FALSE(second.isServed());
    Client third(port_);
    EXPECT_TRUE(third.isServed());
    const ProcessId daemon = daemonState(ftpDaemon).daemon;
    EXPECT_EQ(start("three", true), (SessionCount{1, 0})) << "without another daemon";
    EXPECT_FALSE(third.isServed());
    EXPECT_EQ(daemonState(ftpDaemon).daemon, daemon);
}

TEST_F(HandOverTest, ADaemonThatDoesNotComeUpLeavesTheFormerOneServing) {
    start("one");
    const DaemonState before = daemonState(ftpDaemon);
    Client client(port_);
    ASSERT_TRUE(client.isServed());
    const auto refused =
        ftp_.start(testOrder(port_, "two", {"--share", "--refuse", "fatal: unknown directive"}));
    EXPECT_EQ(messageOf(refused), "The FTP daemon does not start: fatal: unknown directive.");
    const DaemonState after = daemonState(ftpDaemon);
    EXPECT_EQ(after.state, RunState::running);
    EXPECT_EQ(after.daemon, before.daemon);
    EXPECT_EQ(after.configurationHash, "one");
    EXPECT_TRUE(client.isServed());
    EXPECT_TRUE(Client(port_).isServed());
    EXPECT_EQ(start("three"), (SessionCount{0, 1}));
}

TEST_F(HandOverTest, ADaemonThatDiesBeforeItListensLeavesNothing) {
    start("one");
    const auto refused = ftp_.start(testOrder(port_, "two", {"--share", "--delay", "60000"}));
    EXPECT_NE(messageOf(refused).find("did not listen"), std::string::npos) << messageOf(refused);
    EXPECT_TRUE(Client(port_).isServed());
    const DaemonState state = daemonState(ftpDaemon);
    EXPECT_TRUE(waitUntil([&] { return childrenOf(state.supervisor.pid).size() == 1; }, patience));
}

TEST_F(HandOverTest, WhatSharesNoPortIsStartedAgainWhenItsSuccessorFails) {
    start("one", false, {});
    Client client(port_);
    ASSERT_TRUE(client.isServed());
    EXPECT_FALSE(ftp_.start(testOrder(port_, "two", {"--refuse", "fatal: unknown directive"})));
    EXPECT_EQ(daemonState(ftpDaemon).configurationHash, "one");
    EXPECT_TRUE(isServing(daemonState(ftpDaemon)));
    EXPECT_TRUE(client.isServed());
    EXPECT_TRUE(Client(port_).isServed());
}

TEST_F(HandOverTest, ADaemonThatMovesListensBeforeTheFormerOneEnds) {
    start("one", false, {});
    Client client(port_);
    ASSERT_TRUE(client.isServed());
    const int formerPort = port_;
    port_ = freePort();
    EXPECT_EQ(start("two", false, {}), (SessionCount{0, 1}));
    EXPECT_FALSE(accepts(formerPort));
    EXPECT_TRUE(client.isServed());
    EXPECT_TRUE(Client(port_).isServed());
}

TEST_F(HandOverTest, ManyLeaveNoProcessFileOrPort) {
    start("0");
    start("1");
    ASSERT_TRUE(waitUntil([this] { return listenersOn(port_) == 1; }, patience));
    const ProcessId supervisor = daemonState(ftpDaemon).supervisor;
    ASSERT_TRUE(waitUntil([&] { return childrenOf(supervisor.pid).size() == 1; }, patience));
    const std::size_t files = filesOf(supervisor);
    const std::size_t entries = filesIn(root_);
    for (int i = 2; i < 12; ++i) {
        start(std::to_string(i));
    }
    EXPECT_TRUE(waitUntil([this] { return listenersOn(port_) == 1; }, patience));
    EXPECT_TRUE(waitUntil([&] { return childrenOf(supervisor.pid).size() == 1; }, patience));
    EXPECT_TRUE(waitUntil([&] { return filesOf(supervisor) <= files; }, patience));
    EXPECT_TRUE(waitUntil([&] { return filesIn(root_) == entries; }, patience)) << filesIn(root_);
}

TEST_F(HandOverTest, OfAKilledSupervisorTheNextOneEndsAllGenerations) {
    start("one");
    Client first(port_);
    ASSERT_TRUE(first.isServed());
    start("two");
    const DaemonState before = daemonState(ftpDaemon);
    signalProcess(before.supervisor, SIGKILL);
    ASSERT_TRUE(waitUntil([&] { return !isAlive(before.supervisor); }, patience));
    start("three");
    EXPECT_FALSE(first.isServed());
    EXPECT_EQ(listenersOn(port_), 1U);
    EXPECT_TRUE(Client(port_).isServed());
}

TEST_F(HandOverTest, ASupervisorThatIsKilledInTheMiddleLeavesNobodyBehind) {
    start("one");
    const ProcessId supervisor = daemonState(ftpDaemon).supervisor;
    const ControlRequest request{Command::start, testOrder(port_, "two", {"--share", "--delay", "400"})};
    std::thread asking([&] { (void)askSupervisor(statePath("/run/velt"), "ftpd", request, seconds(5)); });
    EXPECT_TRUE(waitUntil([&] { return childrenOf(supervisor.pid).size() == 2; }, patience));
    std::this_thread::sleep_for(milliseconds(100)); // it has begun to start
    signalProcess(supervisor, SIGKILL);
    asking.join();
    start("three");
    std::this_thread::sleep_for(milliseconds(500)); // by now it would listen
    EXPECT_EQ(listenersOn(port_), 1U);
    EXPECT_EQ(leftProcesses().size(), 2U) << "the supervisor and its daemon";
}

TEST_F(HandOverTest, ACrashOfTheDaemonKeepsItsSessions) {
    start("one");
    Client client(port_);
    ASSERT_TRUE(client.isServed());
    const ProcessId former = daemonState(ftpDaemon).daemon;
    signalProcess(former, SIGKILL);
    ASSERT_TRUE(waitUntil(
        [&] { return isServing(daemonState(ftpDaemon)) && daemonState(ftpDaemon).daemon != former; },
        patience));
    EXPECT_TRUE(client.isServed());
    const auto stopped = ftp_.stop();
    EXPECT_EQ(stopped.valueOr({}), (SessionCount{1, 0}));
    EXPECT_FALSE(client.isServed());
}

TEST_F(HandOverTest, ASupervisorOfAnotherVersionIsReplaced) {
    start("one");
    // A start as an earlier version wrote it is unknown to this one, as this one's is to that.
    auto listener = ControlListener::open(statePath("/run/velt"), "ftpd");
    ASSERT_TRUE(listener);
    const ProcessId supervisor = daemonState(ftpDaemon).supervisor;
    std::thread former([&] {
        const auto unknown = [](const ControlRequest& request) {
            return request.command == Command::start ? Result<SessionCount>(Error(unknownRequest))
                                                     : Result<SessionCount>(SessionCount{});
        };
        listener->serve(unknown);
        listener->serve([&](const ControlRequest& request) {
            signalProcess(supervisor, SIGTERM);
            return unknown(request);
        });
    });
    start("two");
    former.join();
    EXPECT_NE(daemonState(ftpDaemon).supervisor, supervisor);
    EXPECT_TRUE(Client(port_).isServed());
}

TEST_F(HandOverTest, WhatIsClosedAcceptsNobodyAndEndsWithItsLastSession) {
    start("one");
    Client first(port_);
    ASSERT_TRUE(first.isServed());
    start("two");
    const ProcessId supervisor = daemonState(ftpDaemon).supervisor;
    {
        Client second(port_);
        ASSERT_TRUE(second.isServed());
        const auto closed = ftp_.close();
        ASSERT_EQ(messageOf(closed), "");
        EXPECT_EQ(*closed, (SessionCount{0, 2}));
        EXPECT_EQ(listenersOn(port_), 0U);
        EXPECT_EQ(daemonState(ftpDaemon).state, RunState::closed);
        EXPECT_EQ(sessionsOf(daemonState(ftpDaemon)).size(), 2U);
        EXPECT_TRUE(first.isServed());
        EXPECT_TRUE(second.isServed());
    }
    EXPECT_TRUE(waitUntil([&] { return sessionsOf(daemonState(ftpDaemon)).size() == 1; }, patience));
    EXPECT_TRUE(isAlive(supervisor));
    EXPECT_TRUE(first.isServed());
    signalProcess(sessionsOf(daemonState(ftpDaemon)).at(0), SIGTERM);
    EXPECT_TRUE(waitUntil([&] { return !isAlive(supervisor); }, patience));
    EXPECT_EQ(daemonState(ftpDaemon).state, RunState::stopped);
    EXPECT_TRUE(waitUntil([] { return leftProcesses().empty(); }, patience));
}

TEST_F(HandOverTest, WhatIsClosedWithoutSessionsEndsAtOnce) {
    start("one");
    const ProcessId supervisor = daemonState(ftpDaemon).supervisor;
    EXPECT_EQ(ftp_.close().valueOr({1, 1}), (SessionCount{0, 0}));
    EXPECT_TRUE(waitUntil([&] { return !isAlive(supervisor); }, patience));
    EXPECT_EQ(daemonState(ftpDaemon).state, RunState::stopped);
    EXPECT_EQ(messageOf(ftp_.close()), "") << "there is nothing to do";
}

TEST_F(HandOverTest, AStartTakesOverTheSessionsOfWhatWasClosed) {
    start("one");
    Client former(port_);
    ASSERT_TRUE(former.isServed());
    const ProcessId supervisor = daemonState(ftpDaemon).supervisor;
    ASSERT_EQ(messageOf(ftp_.close()), "");
    EXPECT_EQ(start("one"), (SessionCount{0, 1}));
    EXPECT_EQ(daemonState(ftpDaemon).supervisor, supervisor);
    EXPECT_TRUE(isServing(daemonState(ftpDaemon)));
    Client next(port_);
    EXPECT_TRUE(next.isServed());
    EXPECT_TRUE(former.isServed());
    EXPECT_EQ(ftp_.stop().valueOr({}), (SessionCount{2, 0}));
    EXPECT_FALSE(former.isServed());
}

TEST_F(HandOverTest, AStopEndsTheSessionsOfWhatWasClosed) {
    start("one");
    Client client(port_);
    ASSERT_TRUE(client.isServed());
    ASSERT_EQ(messageOf(ftp_.close()), "");
    EXPECT_EQ(ftp_.stop().valueOr({}), (SessionCount{1, 0}));
    EXPECT_FALSE(client.isServed());
    EXPECT_TRUE(leftProcesses().empty());
}

TEST_F(HandOverTest, ASupervisorThatCannotCloseIsNotMadeToEndSessions) {
    start("one");
    Client client(port_);
    ASSERT_TRUE(client.isServed());
    auto listener = ControlListener::open(statePath("/run/velt"), "ftpd");
    ASSERT_TRUE(listener);
    const ProcessId supervisor = daemonState(ftpDaemon).supervisor;
    std::thread former([&] {
        listener->serve([](const ControlRequest&) { return Result<SessionCount>(Error(unknownRequest)); });
    });
    EXPECT_EQ(messageOf(ftp_.close()), "The FTP daemon cannot be closed: its supervisor is of a former "
                                       "version, which can only end the sessions.");
    former.join();
    EXPECT_TRUE(client.isServed());
    signalProcess(supervisor, SIGTERM); // nobody can reach its socket any more
    EXPECT_TRUE(waitUntil([&] { return !isAlive(supervisor); }, patience));
}

TEST_F(HandOverTest, NewConnectionsGoToTheSuccessorAlone) {
    start("one");
    const ProcessId former = daemonState(ftpDaemon).daemon;
    start("two");
    const ProcessId successor = daemonState(ftpDaemon).daemon;
    ASSERT_TRUE(isAlive(former)) << "it stays for those who began to connect";
    std::vector<std::unique_ptr<Client>> clients;
    for (int i = 0; i < 40; ++i) {
        clients.push_back(std::make_unique<Client>(port_));
        ASSERT_TRUE(clients.back()->isServed());
    }
    EXPECT_TRUE(childrenOf(former.pid).empty());
    EXPECT_EQ(childrenOf(successor.pid).size(), 40U);
}

} // namespace
} // namespace velt::test
