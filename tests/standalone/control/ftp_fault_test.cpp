// The FTP daemon's start, change, restoring and stop while one system call after another fails, in the
// process that asks and in the supervisor: it ends in time and says what is so, nothing is orphaned, a daemon
// that is to be replaced serves until the next one does, and the next request works.
#include "standalone/control/daemon_control.h"
#include "standalone/standalone.h"
#include "tests/standalone/control/services_fixture.h"
#include "tests/support/fault_sweep.h"
#include "tests/support/waiting.h"

#include <csignal>
#include <functional>
#include <optional>

namespace velt::test {
namespace {

const Daemon& ftp() {
    return *daemonServing("ftpd");
}

std::string outcome(const Result<>& result) {
    return result ? "done" : "failed: " + result.error().message;
}

/// As a host does it.
std::string change() {
    ServiceRequest request;
    const std::string done = outcome(startDaemon(ftp()));
    const auto finished = request.finish();
    return finished ? done : "failed: " + finished.error().message;
}

class FtpFaults : public ServicesTest {
protected:
    void SetUp() override {
        ServicesTest::SetUp();
        planDouble().ftpOptions = {"--share"};
    }

    /// Runs with the former settings, at the former port.
    void runFormer() {
        ftpPort_ = former_;
        storeFtp(plain);
        ASSERT_EQ(outcome(startDaemon(ftp())), "done");
    }

    void stopAll() { ASSERT_EQ(outcome(stopDaemon(ftp())), "done"); }

    static bool counts(const SeenCall& call) {
        return (call.ofChild || call.program.starts_with("velt-superv")) && !isLoading(call);
    }

    static void expectToldWhy(const SweptRun& run) {
        const std::string& told = run.end.told;
        EXPECT_TRUE(told == "done" || (told.starts_with("failed: ") && told.ends_with("."))) << told;
        EXPECT_EQ(told.find("session was cut"), std::string::npos) << told;
        EXPECT_TRUE(told == "done" || !run.call.name.empty()) << told;
    }

    static void expectNothingLeft() {
        EXPECT_EQ(outcome(stopDaemon(ftp())), "done") << "the next stop";
        EXPECT_TRUE(waitUntil([] { return leftProcesses().empty(); }, std::chrono::seconds(2)));
    }

    void expectNextStart(int port) const {
        EXPECT_TRUE(accepts(former_) || accepts(port) || !servicesDown().empty())
            << "a service that is down is told";
        EXPECT_EQ(outcome(startDaemon(ftp())), "done") << "the next start";
        EXPECT_TRUE(accepts(port));
        EXPECT_TRUE(servicesDown().empty());
    }

    FaultSweep sweepOf(const std::function<std::string()>& act) const {
        FaultSweep sweep;
        sweep.act = act;
        sweep.counts = counts;
        sweep.share = Share::first;
        return sweep;
    }

    /// The change of the port and the upload rate of a daemon that has a session. Its supervisor is started
    /// in the run, since only what a run starts is watched.
    FaultSweep sweepOfChange(int port, int uploadRate) {
        FaultSweep sweep = sweepOf({});
        sweep.prepare = [this] { stopAll(); };
        sweep.hasBegin = true;
        sweep.act = [this, port, uploadRate] {
            runFormer();
            Client session(former_);
            if (!session.isServed()) { // not only waiting at the daemon's socket
                return std::string("There is no session.");
            }
            ftpPort_ = port;
            storeFtp(plain, uploadRate);
            beginFaults();
            const std::string told = change();
            endFaults();
            return session.isServed() ? told : told + " And the session was cut.";
        };
        return sweep;
    }

    const int former_ = ftpPort_;
    const int next_ = freePort();
};

TEST_F(FtpFaults, AStartIsDoneOrNothingRuns) {
    FaultSweep sweep = sweepOf([] { return outcome(startDaemon(ftp())); });
    sweep.prepare = [this] { stopAll(); };
    sweep.check = [this](const SweptRun& run) {
        expectToldWhy(run);
        EXPECT_TRUE(run.end.told != "done" || accepts(former_));
        expectNextStart(former_);
        expectNothingLeft();
    };
    EXPECT_GE(sweepFaults(sweep), 20);
}

TEST_F(FtpFaults, AStopIsDoneOrTold) {
    FaultSweep sweep = sweepOf([] { return outcome(stopDaemon(ftp())); });
    sweep.prepare = [this] { runFormer(); };
    sweep.check = [this](const SweptRun& run) {
        expectToldWhy(run);
        EXPECT_TRUE(run.end.told != "done" || !accepts(former_));
        expectNothingLeft();
    };
    EXPECT_GE(sweepFaults(sweep), 10);
}

TEST_F(FtpFaults, AHandOverNeverLeavesThePortAlone) {
    FaultSweep sweep = sweepOfChange(former_, 500);
    sweep.check = [this](const SweptRun& run) {
        expectToldWhy(run);
        EXPECT_TRUE(accepts(former_)) << "the former daemon or the next: " << run.end.told;
        expectNextStart(former_);
        expectNothingLeft();
    };
    EXPECT_GE(sweepFaults(sweep), 40);
}

TEST_F(FtpFaults, AMoveLeavesTheFormerOrTheNextPort) {
    FaultSweep sweep = sweepOfChange(next_, 0);
    sweep.check = [this](const SweptRun& run) {
        expectToldWhy(run);
        EXPECT_TRUE(accepts(next_) || (accepts(former_) && run.end.told != "done")) << run.end.told;
        EXPECT_FALSE(accepts(next_) && accepts(former_));
        expectNextStart(next_);
        EXPECT_FALSE(accepts(former_));
        expectNothingLeft();
    };
    EXPECT_GE(sweepFaults(sweep), 40);
}

TEST_F(FtpFaults, ARestoreIsDoneOrTold) {
    FaultSweep sweep = sweepOf([] { return outcome(restoreDaemon(ftp())); });
    sweep.counts = [](const SeenCall& call) { return call.ofChild && !isLoading(call); };
    sweep.prepare = [this] {
        runFormer();
        signalProcess(serviceState("ftpd").supervisor, SIGKILL);
        ASSERT_TRUE(waitUntil([] { return lostItsSupervisor(serviceState("ftpd")); }, patience));
    };
    sweep.check = [this](const SweptRun& run) {
        expectToldWhy(run);
        EXPECT_TRUE(run.end.told != "done" || accepts(former_));
        expectNextStart(former_);
        expectNothingLeft();
    };
    EXPECT_GE(sweepFaults(sweep), 20);
}

} // namespace
} // namespace velt::test
