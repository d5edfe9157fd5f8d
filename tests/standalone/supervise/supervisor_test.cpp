// velt-supervise with a real daemon, driven as the services drive it.

#include "standalone/contract/last_error.h"
#include "standalone/control/supervised_daemon.h"
#include "standalone/core/state_root.h"
#include "standalone/process/listening_sockets.h"
#include "tests/standalone/supervise/daemon_test.h"
#include "tests/support/ports.h"
#include "tests/support/result.h"
#include "tests/support/waiting.h"

#include <sys/wait.h>
#include <unistd.h>

#include <csignal>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <thread>

namespace velt::test {
namespace {

using std::chrono::milliseconds;
using std::chrono::seconds;

class SupervisorTest : public DaemonTest {
protected:
    void TearDown() override {
        EXPECT_EQ(messageOf(sftp_.stop()), "");
        DaemonTest::TearDown();
    }

    void start(const std::string& hash = "one", const std::vector<std::string>& options = {}) {
        ASSERT_EQ(messageOf(sftp_.start(testOrder(port_, hash, options))), "");
    }

    /// Starts it. Returns a promised time, and what is to be added where starts are seen to take long.
    milliseconds startAndScale(milliseconds promised) {
        return promised + 3 * timeOf([this] { start(); });
    }

    void kill(const ProcessId& process) {
        signalProcess(process, SIGKILL);
        ASSERT_TRUE(waitUntil([&] { return !isAlive(process); }, patience));
    }

    static bool runsInsteadOf(const ProcessId& former) {
        const DaemonState now = daemonState(sftpDaemon);
        return now.state == RunState::running && now.daemon != former;
    }

    SupervisedDaemon sftp_{sftpDaemon};
    int port_ = freePort();
};

TEST_F(SupervisorTest, AStartReturnsWhenThePortAccepts) {
    ASSERT_EQ(messageOf(sftp_.start(testOrder(port_, "one", {"--delay", "150"}))), "");
    EXPECT_TRUE(accepts(port_));
    const DaemonState state = daemonState(sftpDaemon);
    EXPECT_EQ(state.state, RunState::running);
    EXPECT_EQ(state.configurationHash, "one");
    EXPECT_EQ(state.ports, std::vector{port_});
    EXPECT_TRUE(isServing(state));
    EXPECT_TRUE(listensOn(state.daemon.pid, port_));
}

TEST_F(SupervisorTest, TheReadinessTestMakesNoConnection) {
    start();
    EXPECT_TRUE(descendantsOf(daemonState(sftpDaemon).daemon.pid).empty()) << "a session was made";
}

TEST_F(SupervisorTest, ADaemonThatRefusesToStartSaysWhy) {
    const auto began = Clock::now();
    const std::string refusal =
        messageOf(sftp_.start(testOrder(port_, "one", {"--refuse", "fatal: unknown directive 'Prot'"})));
    EXPECT_LT(Clock::now() - began, seconds(3));
    EXPECT_NE(refusal.find("fatal: unknown directive 'Prot'"), std::string::npos) << refusal;
    EXPECT_EQ(daemonState(sftpDaemon).state, RunState::failed);
    EXPECT_TRUE(waitUntil([] { return leftProcesses().empty(); }, patience));
}

TEST_F(SupervisorTest, AdviceThatFollowsTheReasonDoesNotCrowdItOut) {
    const std::string prefix = "2026-11-21 09:07:45,975 vm proftpd[28866]: ";
    EXPECT_FALSE(sftp_.start(
        testOrder(port_, "one",
                  {"--refuse", prefix + "fatal: unknown configuration directive 'Prot'\n" + prefix +
                                   "fatal: Did you mean:\n  Protocols\n  Port\n" + "  From\n  User"})));
    EXPECT_EQ(daemonState(sftpDaemon).reason, "unknown configuration directive 'Prot'");
}

TEST_F(SupervisorTest, ALineThatWasCutShowsIt) {
    EXPECT_FALSE(
        sftp_.start(testOrder(port_, "one", {"--refuse", "why: " + std::string(1000, 'x') + " end"})));
    EXPECT_NE(daemonState(sftpDaemon).reason.find("xxx…"), std::string::npos)
        << daemonState(sftpDaemon).reason;
    EXPECT_EQ(daemonState(sftpDaemon).reason.find("end"), std::string::npos)
        << daemonState(sftpDaemon).reason;
}

TEST_F(SupervisorTest, ADaemonThatNeverListensFailsWithinFiveSeconds) {
    const milliseconds promised = startAndScale(seconds(5));
    const auto began = Clock::now();
    const std::string refusal = messageOf(sftp_.start(testOrder(port_, "two", {"--delay", "60000"})));
    EXPECT_LT(Clock::now() - began, promised);
    EXPECT_NE(refusal.find("did not listen on port " + std::to_string(port_)), std::string::npos) << refusal;
    EXPECT_EQ(daemonState(sftpDaemon).configurationHash, "one") << "the former one serves again";
    EXPECT_TRUE(isServing(daemonState(sftpDaemon)));
    EXPECT_EQ(leftProcesses().size(), 2U) << "the supervisor and one daemon";
}

TEST_F(SupervisorTest, AProgramThatIsNotThereIsNamed) {
    DaemonOrder order = testOrder(port_, "one");
    order.arguments[0] = "/nowhere/daemon";
    const std::string refusal = messageOf(sftp_.start(order));
    EXPECT_NE(refusal.find("/nowhere/daemon"), std::string::npos) << refusal;
}

TEST_F(SupervisorTest, ASupervisorThatDoesNotReportIsToldFromOneThatEnded) {
    const std::string built = std::getenv("VELT_LIBEXEC_DIR");
    const auto useScript = [this](const std::string& line) {
        const auto program = root_ / "velt-supervise";
        std::ofstream(program) << "#!/bin/sh\n" << line << '\n';
        std::filesystem::permissions(program, std::filesystem::perms::owner_all);
        ::setenv("VELT_LIBEXEC_DIR", root_.c_str(), 1);
    };
    useScript("exit 0");
    std::string refusal = messageOf(sftp_.start(testOrder(port_, "one")));
    EXPECT_EQ(refusal, "The SFTP daemon does not start: its supervisor ended without giving a reason.");
    for (const char* line : {"sleep 5.5 &", "echo $$ >hanging; exec sleep 60"}) {
        useScript("cd " + root_.string() + "; " + line);
        const auto began = Clock::now();
        refusal = messageOf(sftp_.start(testOrder(port_, "one")));
        EXPECT_EQ(refusal, "The SFTP daemon does not start: its supervisor did not report in time.") << line;
        EXPECT_LT(Clock::now() - began, seconds(30)) << line;
    }
    pid_t hanging = 0;
    std::ifstream(root_ / "hanging") >> hanging;
    ASSERT_GT(hanging, 0);
    EXPECT_EQ(::kill(hanging, 0), -1) << "it was left behind";
    ::setenv("VELT_LIBEXEC_DIR", built.c_str(), 1);
}

TEST_F(SupervisorTest, ASecondStartWithTheSameConfigurationDoesNothing) {
    start();
    const DaemonState before = daemonState(sftpDaemon);
    start();
    EXPECT_EQ(daemonState(sftpDaemon).daemon, before.daemon);
    EXPECT_EQ(daemonState(sftpDaemon).supervisor, before.supervisor);
}

TEST_F(SupervisorTest, AStartWithAnotherConfigurationReplacesTheDaemon) {
    start();
    const DaemonState before = daemonState(sftpDaemon);
    const int former = port_;
    port_ = freePort();
    start("two");
    EXPECT_FALSE(isAlive(before.daemon));
    EXPECT_EQ(daemonState(sftpDaemon).supervisor, before.supervisor);
    EXPECT_FALSE(accepts(former));
    EXPECT_TRUE(accepts(port_));
}

TEST_F(SupervisorTest, APortOfAnotherProgramIsFoundBeforeTheDaemonStops) {
    start();
    const DaemonState before = daemonState(sftpDaemon);
    const int taken = freePort();
    const Listener other(taken);
    const std::string refusal = messageOf(sftp_.start(testOrder(taken, "two")));
    EXPECT_NE(refusal.find("Port " + std::to_string(taken)), std::string::npos);
    EXPECT_NE(refusal.find("process " + std::to_string(::getpid())), std::string::npos) << refusal;
    EXPECT_EQ(daemonState(sftpDaemon).daemon, before.daemon);
    EXPECT_TRUE(isServing(daemonState(sftpDaemon)));
}

TEST_F(SupervisorTest, AKilledDaemonIsUpAgainWithinTwoSeconds) {
    const milliseconds promised = startAndScale(seconds(2));
    const ProcessId daemon = daemonState(sftpDaemon).daemon;
    EXPECT_EQ(daemonState(sftpDaemon).restarts, 0U);
    kill(daemon);
    EXPECT_TRUE(waitUntil([] { return isServing(daemonState(sftpDaemon)); }, promised));
    EXPECT_NE(daemonState(sftpDaemon).daemon, daemon);
    EXPECT_TRUE(Client(port_).isServed()) << "by a session that has left the listener alone by now";
    EXPECT_EQ(daemonState(sftpDaemon).restarts, 1U);
    ASSERT_EQ(messageOf(sftp_.start(testOrder(port_, "two"))), "");
    EXPECT_EQ(daemonState(sftpDaemon).restarts, 1U) << "a start that is asked for is no restart";
}

TEST_F(SupervisorTest, ADaemonThatKeepsDyingIsStartedLessAndLessOften) {
    const auto file = root_ / "end";
    start("one", {"--end-if", file});
    for (const milliseconds pause :
         {milliseconds(100), milliseconds(200), milliseconds(400), milliseconds(800), milliseconds(1600)}) {
        const ProcessId daemon = daemonState(sftpDaemon).daemon;
        const auto killed = Clock::now();
        kill(daemon);
        ASSERT_TRUE(waitUntil([&] { return runsInsteadOf(daemon); }, pause + patience));
        EXPECT_GE(Clock::now() - killed, pause);
    }
    // A start that is asked for ends the series: the next pause would have been of 3.2 seconds.
    ASSERT_EQ(messageOf(sftp_.start(testOrder(port_, "two", {"--end-if", file}))), "");
    kill(daemonState(sftpDaemon).daemon);
    EXPECT_TRUE(waitUntil([] { return isServing(daemonState(sftpDaemon)); }, milliseconds(3000)));
    std::ofstream(file).flush();
    EXPECT_TRUE(
        waitUntil([] { return daemonState(sftpDaemon).reason == "velt-test-daemon: told to end"; }, patience))
        << daemonState(sftpDaemon).reason;
    EXPECT_EQ(daemonState(sftpDaemon).state, RunState::failed);
}

TEST_F(SupervisorTest, APauseEndsTheListenerAndLeavesTheSessions) {
    start();
    Client client(port_);
    ASSERT_TRUE(client.isServed());
    ASSERT_EQ(messageOf(sftp_.pause()), "");
    EXPECT_FALSE(accepts(port_));
    EXPECT_TRUE(client.isServed());
    EXPECT_EQ(daemonState(sftpDaemon).state, RunState::paused);
    EXPECT_EQ(messageOf(sftp_.pause()), "") << "a second pause changes nothing";

    port_ = freePort();
    start("two");
    EXPECT_TRUE(accepts(port_));
    EXPECT_TRUE(client.isServed());
}

TEST_F(SupervisorTest, APausedServiceIsNotStartedAgainByItself) {
    start();
    ASSERT_EQ(messageOf(sftp_.pause()), "");
    std::this_thread::sleep_for(milliseconds(400));
    EXPECT_EQ(daemonState(sftpDaemon).state, RunState::paused);
    EXPECT_FALSE(accepts(port_));
}

TEST_F(SupervisorTest, APauseEndsTheWaitForARestart) {
    start();
    for (int i = 0; i < 2; ++i) {
        const ProcessId daemon = daemonState(sftpDaemon).daemon;
        kill(daemon);
        ASSERT_TRUE(waitUntil([&] { return runsInsteadOf(daemon); }, patience));
    }
    kill(daemonState(sftpDaemon).daemon); // after this third end it waits for 400 ms
    ASSERT_TRUE(waitUntil([] { return daemonState(sftpDaemon).state == RunState::failed; }, patience));
    ASSERT_EQ(messageOf(sftp_.pause()), "");
    std::this_thread::sleep_for(milliseconds(800));
    EXPECT_EQ(daemonState(sftpDaemon).state, RunState::paused);
    EXPECT_FALSE(accepts(port_));
}

TEST_F(SupervisorTest, AStopEndsTheSessionsOfAListenerThatIsGone) {
    start();
    Client client(port_);
    ASSERT_TRUE(client.isServed());
    ASSERT_EQ(messageOf(sftp_.pause()), "");
    ASSERT_EQ(messageOf(sftp_.stop()), "");
    EXPECT_FALSE(client.isServed());
    EXPECT_TRUE(leftProcesses().empty());
    EXPECT_EQ(daemonState(sftpDaemon).state, RunState::stopped);
}

TEST_F(SupervisorTest, StoppingAndPausingWhatDoesNotRunSucceeds) {
    EXPECT_EQ(messageOf(sftp_.stop()), "");
    EXPECT_EQ(messageOf(sftp_.pause()), "");
    EXPECT_EQ(daemonState(sftpDaemon).state, RunState::stopped);
}

TEST_F(SupervisorTest, ADaemonThatIgnoresTheRequestToEndIsKilled) {
    start("one", {"--stubborn"});
    const ProcessId daemon = daemonState(sftpDaemon).daemon;
    EXPECT_EQ(messageOf(sftp_.stop()), "");
    EXPECT_FALSE(isAlive(daemon));
}

TEST_F(SupervisorTest, TheNextStartEndsWhatAKilledSupervisorLeft) {
    start();
    Client client(port_);
    ASSERT_TRUE(client.isServed());
    const DaemonState before = daemonState(sftpDaemon);
    kill(before.supervisor);
    EXPECT_TRUE(isServing(daemonState(sftpDaemon))) << "the daemon serves on";
    start(); // the same port, so the former daemon must be gone
    EXPECT_FALSE(isAlive(before.daemon));
    EXPECT_FALSE(client.isServed());
    EXPECT_NE(daemonState(sftpDaemon).supervisor, before.supervisor);
    EXPECT_TRUE(isServing(daemonState(sftpDaemon)));
}

TEST_F(SupervisorTest, AStopEndsWhatAKilledSupervisorLeft) {
    start();
    Client client(port_);
    ASSERT_TRUE(client.isServed());
    const DaemonState before = daemonState(sftpDaemon);
    kill(before.supervisor);
    ASSERT_EQ(messageOf(sftp_.stop()), "");
    EXPECT_FALSE(isAlive(before.daemon));
    EXPECT_TRUE(waitUntil([] { return leftProcesses().empty(); }, patience));
}

TEST_F(SupervisorTest, PausedSessionsAreFoundAfterTheirSupervisorWasKilled) {
    start();
    Client client(port_);
    ASSERT_TRUE(client.isServed());
    ASSERT_EQ(messageOf(sftp_.pause()), "");
    ASSERT_EQ(daemonState(sftpDaemon).sessions.size(), 1U);
    kill(daemonState(sftpDaemon).supervisor);
    ASSERT_TRUE(client.isServed());
    ASSERT_EQ(messageOf(sftp_.stop()), "");
    EXPECT_FALSE(client.isServed());
}

TEST_F(SupervisorTest, APidThatBelongsToAnotherProcessNowIsLeftAlone) {
    const pid_t bystander = ::fork();
    if (bystander == 0) {
        ::pause();
        ::_exit(0);
    }
    const auto process = identifyProcess(bystander);
    ASSERT_TRUE(process);
    DaemonState stale;
    stale.state = RunState::running;
    stale.daemon = {bystander, process->startTime + 1};
    stale.supervisor = stale.daemon;
    std::filesystem::create_directories(statePath("/run/velt"));
    ASSERT_TRUE(storeDaemonState(stateFile(statePath("/run/velt"), "sftp"), stale));
    EXPECT_FALSE(isServing(stale));
    EXPECT_EQ(messageOf(sftp_.stop()), "");
    EXPECT_TRUE(isAlive(*process));
    ::kill(bystander, SIGKILL);
    ::waitpid(bystander, nullptr, 0);
}

TEST_F(SupervisorTest, ItSurvivesTheEndOfTheProcessThatStartedIt) {
    const pid_t starter = ::fork();
    if (starter == 0) {
        ::_exit(sftp_.start(testOrder(port_, "one")) ? 0 : 1);
    }
    int status = -1;
    ASSERT_EQ(::waitpid(starter, &status, 0), starter);
    ASSERT_EQ(status, 0);
    EXPECT_TRUE(isServing(daemonState(sftpDaemon)));
    kill(daemonState(sftpDaemon).daemon);
    EXPECT_TRUE(waitUntil([] { return isServing(daemonState(sftpDaemon)); }, patience));
}

TEST_F(SupervisorTest, ASupervisorThatIsAskedToEndTakesItsDaemonAlong) {
    start();
    const DaemonState before = daemonState(sftpDaemon);
    signalProcess(before.supervisor, SIGTERM);
    EXPECT_TRUE(waitUntil([&] { return !isAlive(before.supervisor) && !isAlive(before.daemon); }, patience));
    EXPECT_FALSE(accepts(port_));
}

TEST_F(SupervisorTest, ASupervisorThatHangsIsEndedByAStop) {
    start();
    const DaemonState before = daemonState(sftpDaemon);
    signalProcess(before.supervisor, SIGSTOP);
    EXPECT_EQ(messageOf(sftp_.stop()), "");
    EXPECT_FALSE(isAlive(before.supervisor));
    EXPECT_FALSE(isAlive(before.daemon));
}

TEST_F(SupervisorTest, TheDaemonInheritsNoBlockedSignalAndNoDescriptor) {
    sigset_t blocked;
    sigfillset(&blocked);
    sigset_t former;
    ::pthread_sigmask(SIG_SETMASK, &blocked, &former);
    const int stray = ::dup(STDERR_FILENO);
    start();
    ::close(stray);
    ::pthread_sigmask(SIG_SETMASK, &former, nullptr);
    const std::string process = "/proc/" + std::to_string(daemonState(sftpDaemon).daemon.pid);
    std::ifstream status(process + "/status");
    std::string mask;
    for (std::string line; std::getline(status, line);) {
        if (line.starts_with("SigBlk:")) {
            mask = line.substr(line.find_last_of("\t ") + 1);
        }
    }
    EXPECT_EQ(mask, "0000000000000000");
    int descriptors = 0;
    for ([[maybe_unused]] const auto& entry : std::filesystem::directory_iterator(process + "/fd")) {
        ++descriptors;
    }
    EXPECT_EQ(descriptors, 4) << "the standard three and its listening socket";
}

TEST_F(SupervisorTest, AStateRootMayLieDeep) {
    setStateRoot(root_ / std::string(90, 'a') / std::string(90, 'b'));
    start();
    EXPECT_EQ(messageOf(sftp_.pause()), "");
    EXPECT_EQ(messageOf(sftp_.stop()), "");
}

} // namespace
} // namespace velt::test
