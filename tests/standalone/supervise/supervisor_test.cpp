// velt-supervise with a real daemon, driven as the services drive it.

#include "standalone/control/supervise_backend.h"
#include "standalone/core/last_error.h"
#include "standalone/core/state_root.h"
#include "standalone/process/listening_sockets.h"
#include "tests/standalone/supervise/daemon_test.h"

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
using Clock = std::chrono::steady_clock;

class SupervisorTest : public DaemonTest {
protected:
    void TearDown() override {
        EXPECT_EQ(backend_.stop(), 0) << lastErrorSentence();
        DaemonTest::TearDown();
    }

    void start(const std::string& hash = "one", const std::vector<std::string>& options = {}) {
        ASSERT_EQ(backend_.start(testPlan(port_, hash, options)), 0) << lastErrorSentence();
    }

    void kill(const ProcessId& process) {
        signalProcess(process, SIGKILL);
        ASSERT_TRUE(waitUntil([&] { return !isAlive(process); }, seconds(2)));
    }

    SuperviseBackend backend_{"sftp"};
    int port_ = freePort();
};

TEST_F(SupervisorTest, AStartReturnsWhenThePortAccepts) {
    ASSERT_EQ(backend_.start(testPlan(port_, "one", {"--delay", "150"})), 0) << lastErrorSentence();
    EXPECT_TRUE(accepts(port_));
    const ServiceState state = backend_.state();
    EXPECT_EQ(state.state, RunState::running);
    EXPECT_EQ(state.configurationHash, "one");
    EXPECT_EQ(state.ports, std::vector{port_});
    EXPECT_TRUE(isServing(state));
    EXPECT_TRUE(listensOn(state.daemon.pid, port_));
}

TEST_F(SupervisorTest, TheReadinessTestMakesNoConnection) {
    start();
    EXPECT_TRUE(descendantsOf(backend_.state().daemon.pid).empty()) << "a session was made";
}

TEST_F(SupervisorTest, ADaemonThatRefusesToStartSaysWhy) {
    const auto began = Clock::now();
    EXPECT_LT(backend_.start(testPlan(port_, "one", {"--refuse", "fatal: unknown directive 'Prot'"})), 0);
    EXPECT_LT(Clock::now() - began, seconds(1));
    EXPECT_NE(lastErrorSentence().find("fatal: unknown directive 'Prot'"), std::string::npos)
        << lastErrorSentence();
    EXPECT_EQ(backend_.state().state, RunState::failed);
    EXPECT_TRUE(waitUntil([] { return leftProcesses().empty(); }, seconds(1)));
}

TEST_F(SupervisorTest, AdviceThatFollowsTheReasonDoesNotCrowdItOut) {
    const std::string prefix = "2026-11-21 09:07:45,975 vm proftpd[28866]: ";
    EXPECT_LT(backend_.start(testPlan(
                  port_, "one",
                  {"--refuse", prefix + "fatal: unknown configuration directive 'Prot'\n" + prefix +
                                   "fatal: Did you mean:\n  Protocols\n  Port\n" + "  From\n  User"})),
              0);
    EXPECT_EQ(backend_.state().reason, "unknown configuration directive 'Prot'");
}

TEST_F(SupervisorTest, ALineThatWasCutShowsIt) {
    EXPECT_LT(backend_.start(testPlan(port_, "one", {"--refuse", "why: " + std::string(1000, 'x') + " end"})),
              0);
    EXPECT_NE(backend_.state().reason.find("xxx…"), std::string::npos) << backend_.state().reason;
    EXPECT_EQ(backend_.state().reason.find("end"), std::string::npos) << backend_.state().reason;
}

TEST_F(SupervisorTest, ADaemonThatNeverListensFailsWithinFiveSeconds) {
    const auto began = Clock::now();
    EXPECT_LT(backend_.start(testPlan(port_, "one", {"--delay", "60000"})), 0);
    EXPECT_LT(Clock::now() - began, milliseconds(5000));
    EXPECT_NE(lastErrorSentence().find("did not listen on port " + std::to_string(port_)), std::string::npos)
        << lastErrorSentence();
}

TEST_F(SupervisorTest, AProgramThatIsNotThereIsNamed) {
    DaemonPlan plan = testPlan(port_, "one");
    plan.arguments[0] = "/nowhere/daemon";
    EXPECT_LT(backend_.start(plan), 0);
    EXPECT_NE(lastErrorSentence().find("/nowhere/daemon"), std::string::npos) << lastErrorSentence();
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
    EXPECT_LT(backend_.start(testPlan(port_, "one")), 0);
    EXPECT_EQ(lastErrorSentence(), "The SFTP daemon does not start: its supervisor ended without a reason.");
    useScript("sleep 5.5 &");
    EXPECT_LT(backend_.start(testPlan(port_, "one")), 0);
    EXPECT_EQ(lastErrorSentence(), "The SFTP daemon does not start: its supervisor does not report in time.");
    ::setenv("VELT_LIBEXEC_DIR", built.c_str(), 1);
}

TEST_F(SupervisorTest, ASecondStartWithTheSameConfigurationDoesNothing) {
    start();
    const ServiceState before = backend_.state();
    start();
    EXPECT_EQ(backend_.state().daemon, before.daemon);
    EXPECT_EQ(backend_.state().supervisor, before.supervisor);
}

TEST_F(SupervisorTest, AStartWithAnotherConfigurationReplacesTheDaemon) {
    start();
    const ServiceState before = backend_.state();
    const int former = port_;
    port_ = freePort();
    start("two");
    EXPECT_FALSE(isAlive(before.daemon));
    EXPECT_EQ(backend_.state().supervisor, before.supervisor);
    EXPECT_FALSE(accepts(former));
    EXPECT_TRUE(accepts(port_));
}

TEST_F(SupervisorTest, APortOfAnotherProgramIsFoundBeforeTheDaemonStops) {
    start();
    const ServiceState before = backend_.state();
    const int taken = freePort();
    const Listener other(taken);
    EXPECT_LT(backend_.start(testPlan(taken, "two")), 0);
    EXPECT_NE(lastErrorSentence().find("Port " + std::to_string(taken)), std::string::npos);
    EXPECT_NE(lastErrorSentence().find("process " + std::to_string(::getpid())), std::string::npos)
        << lastErrorSentence();
    EXPECT_EQ(backend_.state().daemon, before.daemon);
    EXPECT_TRUE(isServing(backend_.state()));
}

TEST_F(SupervisorTest, AKilledDaemonIsUpAgainWithinTwoSeconds) {
    start();
    const ProcessId daemon = backend_.state().daemon;
    EXPECT_EQ(backend_.state().restarts, 0U);
    const auto began = Clock::now();
    kill(daemon);
    EXPECT_TRUE(waitUntil([this] { return isServing(backend_.state()); }, seconds(2)));
    RecordProperty("milliseconds", static_cast<int>((Clock::now() - began) / milliseconds(1)));
    EXPECT_NE(backend_.state().daemon, daemon);
    EXPECT_TRUE(accepts(port_));
    EXPECT_EQ(backend_.state().restarts, 1U);
    ASSERT_EQ(backend_.start(testPlan(port_, "two")), 0) << lastErrorSentence();
    EXPECT_EQ(backend_.state().restarts, 1U) << "a start that is asked for is no restart";
}

TEST_F(SupervisorTest, ADaemonThatKeepsDyingIsStartedLessAndLessOften) {
    start("one", {"--live", "200"});
    std::vector<ProcessId> seen;
    const auto end = Clock::now() + seconds(2);
    while (Clock::now() < end) {
        const ProcessId daemon = backend_.state().daemon;
        if (daemon && (seen.empty() || seen.back() != daemon)) {
            seen.push_back(daemon);
        }
        std::this_thread::sleep_for(milliseconds(2));
    }
    // Each lives for 0.2 s; the pauses are 0.1, 0.2, 0.4 and 0.8 s. Without them there would be nearly ten.
    EXPECT_GE(seen.size(), 3U);
    EXPECT_LE(seen.size(), 5U);
    ASSERT_TRUE(waitUntil([this] { return backend_.state().state == RunState::failed; }, seconds(4)));
    EXPECT_NE(backend_.state().reason.find("lived long enough"), std::string::npos)
        << backend_.state().reason;
}

TEST_F(SupervisorTest, APauseEndsTheListenerAndLeavesTheSessions) {
    start();
    Client client(port_);
    ASSERT_TRUE(client.isServed());
    ASSERT_EQ(backend_.pause(), 0) << lastErrorSentence();
    EXPECT_FALSE(accepts(port_));
    EXPECT_TRUE(client.isServed());
    EXPECT_EQ(backend_.state().state, RunState::paused);
    EXPECT_EQ(backend_.pause(), 0) << "a second pause changes nothing";

    port_ = freePort();
    start("two");
    EXPECT_TRUE(accepts(port_));
    EXPECT_TRUE(client.isServed());
}

TEST_F(SupervisorTest, APausedServiceIsNotStartedAgainByItself) {
    start();
    ASSERT_EQ(backend_.pause(), 0);
    std::this_thread::sleep_for(milliseconds(400));
    EXPECT_EQ(backend_.state().state, RunState::paused);
    EXPECT_FALSE(accepts(port_));
}

TEST_F(SupervisorTest, AStopEndsTheSessionsOfAListenerThatIsGone) {
    start();
    Client client(port_);
    ASSERT_TRUE(client.isServed());
    ASSERT_EQ(backend_.pause(), 0);
    ASSERT_EQ(backend_.stop(), 0) << lastErrorSentence();
    EXPECT_FALSE(client.isServed());
    EXPECT_TRUE(leftProcesses().empty());
    EXPECT_EQ(backend_.state().state, RunState::stopped);
}

TEST_F(SupervisorTest, StoppingAndPausingWhatDoesNotRunSucceeds) {
    EXPECT_EQ(backend_.stop(), 0);
    EXPECT_EQ(backend_.pause(), 0);
    EXPECT_EQ(backend_.state().state, RunState::stopped);
}

TEST_F(SupervisorTest, ADaemonThatIgnoresTheRequestToEndIsKilled) {
    start("one", {"--stubborn"});
    const ProcessId daemon = backend_.state().daemon;
    EXPECT_EQ(backend_.stop(), 0) << lastErrorSentence();
    EXPECT_FALSE(isAlive(daemon));
}

TEST_F(SupervisorTest, TheNextStartEndsWhatAKilledSupervisorLeft) {
    start();
    Client client(port_);
    ASSERT_TRUE(client.isServed());
    const ServiceState before = backend_.state();
    kill(before.supervisor);
    EXPECT_TRUE(isServing(backend_.state())) << "the daemon serves on";
    start(); // the same port, so the former daemon must be gone
    EXPECT_FALSE(isAlive(before.daemon));
    EXPECT_FALSE(client.isServed());
    EXPECT_NE(backend_.state().supervisor, before.supervisor);
    EXPECT_TRUE(isServing(backend_.state()));
}

TEST_F(SupervisorTest, AStopEndsWhatAKilledSupervisorLeft) {
    start();
    Client client(port_);
    ASSERT_TRUE(client.isServed());
    const ServiceState before = backend_.state();
    kill(before.supervisor);
    ASSERT_EQ(backend_.stop(), 0) << lastErrorSentence();
    EXPECT_FALSE(isAlive(before.daemon));
    EXPECT_TRUE(waitUntil([] { return leftProcesses().empty(); }, seconds(1)));
}

TEST_F(SupervisorTest, PausedSessionsAreFoundAfterTheirSupervisorWasKilled) {
    start();
    Client client(port_);
    ASSERT_TRUE(client.isServed());
    ASSERT_EQ(backend_.pause(), 0);
    ASSERT_EQ(backend_.state().sessions.size(), 1U);
    kill(backend_.state().supervisor);
    ASSERT_TRUE(client.isServed());
    ASSERT_EQ(backend_.stop(), 0) << lastErrorSentence();
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
    ServiceState stale;
    stale.state = RunState::running;
    stale.daemon = {bystander, process->startTime + 1};
    stale.supervisor = stale.daemon;
    std::filesystem::create_directories(statePath("/run/velt"));
    ASSERT_TRUE(writeServiceState(stateFile(statePath("/run/velt"), "sftp"), stale));
    EXPECT_FALSE(isServing(stale));
    EXPECT_EQ(backend_.stop(), 0) << lastErrorSentence();
    EXPECT_TRUE(isAlive(*process));
    ::kill(bystander, SIGKILL);
    ::waitpid(bystander, nullptr, 0);
}

TEST_F(SupervisorTest, ASecondSupervisorOfTheServiceIsRefused) {
    start();
    const ServiceState before = backend_.state();
    // As two processes would see it that both found nothing running.
    std::filesystem::remove(stateFile(statePath("/run/velt"), "sftp"));
    const DaemonPlan other = testPlan(freePort(), "two");
    EXPECT_LT(backend_.start(other), 0);
    EXPECT_NE(lastErrorSentence().find("another supervisor"), std::string::npos) << lastErrorSentence();
    ASSERT_TRUE(writeServiceState(stateFile(statePath("/run/velt"), "sftp"), before));
    EXPECT_TRUE(isServing(before));
}

TEST_F(SupervisorTest, ItSurvivesTheEndOfTheProcessThatStartedIt) {
    const pid_t starter = ::fork();
    if (starter == 0) {
        ::_exit(backend_.start(testPlan(port_, "one")) == 0 ? 0 : 1);
    }
    int status = -1;
    ASSERT_EQ(::waitpid(starter, &status, 0), starter);
    ASSERT_EQ(status, 0);
    EXPECT_TRUE(isServing(backend_.state()));
    kill(backend_.state().daemon);
    EXPECT_TRUE(waitUntil([this] { return isServing(backend_.state()); }, seconds(2)));
}

TEST_F(SupervisorTest, ASupervisorThatIsAskedToEndTakesItsDaemonAlong) {
    start();
    const ServiceState before = backend_.state();
    signalProcess(before.supervisor, SIGTERM);
    EXPECT_TRUE(
        waitUntil([&] { return !isAlive(before.supervisor) && !isAlive(before.daemon); }, seconds(3)));
    EXPECT_FALSE(accepts(port_));
}

TEST_F(SupervisorTest, ASupervisorThatHangsIsEndedByAStop) {
    start();
    const ServiceState before = backend_.state();
    signalProcess(before.supervisor, SIGSTOP);
    EXPECT_EQ(backend_.stop(), 0) << lastErrorSentence();
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
    const std::string process = "/proc/" + std::to_string(backend_.state().daemon.pid);
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
    EXPECT_EQ(backend_.pause(), 0) << lastErrorSentence();
    EXPECT_EQ(backend_.stop(), 0) << lastErrorSentence();
}

} // namespace
} // namespace velt::test
