// Supervisors that end without having been asked to.
#include "standalone/standalone.h"
#include "tests/standalone/control/plan_double.h"
#include "tests/standalone/control/services_fixture.h"
#include "tests/support/ports.h"
#include "tests/support/waiting.h"

#include <algorithm>
#include <csignal>
#include <optional>
#include <thread>

namespace velt::test {
namespace {

using std::chrono::milliseconds;
using std::chrono::seconds;

class ServiceWatchTest : public ServicesTest {
protected:
    void SetUp() override {
        ServicesTest::SetUp();
        storeSftp(true);
        promised_ += 3 * timeOf([] { ASSERT_EQ(messageOf(startEnabledServices()), ""); });
    }

    void TearDown() override {
        unwatchServices();
        ServicesTest::TearDown();
    }

    static void kill(const ProcessId& process) {
        signalProcess(process, SIGKILL);
        ASSERT_TRUE(waitUntil([&process] { return !isAlive(process); }, patience));
    }

    /// Whether the service serves under a supervisor, and both are others than these.
    static bool isRestored(const std::string& service, const DaemonState& former) {
        const DaemonState now = serviceState(service);
        return isServing(now) && isAlive(now.supervisor) && !(now.supervisor == former.supervisor) &&
               !(now.daemon == former.daemon);
    }

    /// Two seconds, where starts take next to no time; more where they are seen to take longer.
    milliseconds promised_{2000};
};

TEST_F(ServiceWatchTest, AKilledSupervisorIsReplacedWithinTwoSeconds) {
    ASSERT_EQ(messageOf(watchServices()), "");
    for (const char* service : {"ftpd", "sftp"}) {
        const DaemonState former = serviceState(service);
        kill(former.supervisor);
        EXPECT_TRUE(waitUntil([&] { return isRestored(service, former); }, promised_)) << service;
        EXPECT_FALSE(isAlive(former.daemon)) << "no daemon of ours without a supervisor";
    }
    EXPECT_TRUE(accepts(ftpPort_));
    EXPECT_TRUE(accepts(sftpPort_));
    EXPECT_TRUE(waitUntil([] { return leftProcesses().size() == 4; }, patience))
        << "two supervisors and their daemons remain, once the sessions of these connections have ended";
}

TEST_F(ServiceWatchTest, ADaemonThatDiesWithItsSupervisorIsUpAgainWithinTwoSeconds) {
    ASSERT_EQ(messageOf(watchServices()), "");
    const DaemonState former = serviceState("ftpd");
    signalProcess(former.supervisor, SIGKILL);
    signalProcess(former.daemon, SIGKILL);
    EXPECT_TRUE(waitUntil([&] { return isRestored("ftpd", former); }, promised_));
    EXPECT_TRUE(accepts(ftpPort_));
}

TEST_F(ServiceWatchTest, TheNewDaemonTakesTheStoredSettings) {
    const DaemonState former = serviceState("ftpd");
    const int formerPort = ftpPort_;
    ftpPort_ = freePort();
    storeFtp(plain);
    kill(former.supervisor);
    ASSERT_EQ(messageOf(watchServices()), "");
    EXPECT_TRUE(waitUntil([&] { return isRestored("ftpd", former); }, promised_));
    EXPECT_TRUE(accepts(ftpPort_));
    EXPECT_FALSE(accepts(formerPort));
}

TEST_F(ServiceWatchTest, WhatIsSwitchedOffByNowIsEnded) {
    const DaemonState former = serviceState("sftp");
    storeSftp(false);
    kill(former.supervisor);
    ASSERT_EQ(messageOf(watchServices()), "");
    EXPECT_TRUE(waitUntil([&] { return !isAlive(former.daemon); }, patience));
    EXPECT_TRUE(waitUntil([] { return serviceState("sftp").state == RunState::stopped; }, patience));
}

TEST_F(ServiceWatchTest, AFailedStartIsTriedAgain) {
    const DaemonState former = serviceState("ftpd");
    kill(former.supervisor);
    kill(former.daemon);
    std::optional<Listener> other(ftpPort_);
    ASSERT_EQ(messageOf(watchServices()), "");
    EXPECT_TRUE(waitUntil([] { return servicesDown().size() == 1; }, patience));
    EXPECT_TRUE(waitUntil(
        [] {
            const auto down = servicesDown();
            return down.size() == 1 && down[0].reason.find("is in use by") != std::string::npos;
        },
        patience));
    other.reset();
    EXPECT_TRUE(waitUntil([&] { return isRestored("ftpd", former); }, patience));
}

TEST_F(ServiceWatchTest, AStartThatFailsIsNotTriedAgainAtEachLook) {
    const DaemonState former = serviceState("ftpd");
    kill(former.supervisor);
    kill(former.daemon);
    const Listener other(ftpPort_);
    const int before = ftpPlans();
    ASSERT_EQ(messageOf(watchServices()), "");
    ASSERT_TRUE(waitUntil([before] { return ftpPlans() > before; }, patience));
    std::this_thread::sleep_for(milliseconds(2600));
    EXPECT_LE(ftpPlans() - before, 2) << "a second later, and then after two seconds";
}

TEST_F(ServiceWatchTest, WhatWasStoppedPausedOrRefusedIsLeftAlone) {
    ASSERT_EQ(messageOf(watchServices()), "");
    ASSERT_EQ(VLIBServiceStop("ftpd", 0), 0) << lastErrorSentence();
    ASSERT_EQ(VLIBServicePause("sftp"), 0) << lastErrorSentence();
    kill(serviceState("sftp").supervisor);
    std::this_thread::sleep_for(milliseconds(1200));
    EXPECT_FALSE(accepts(ftpPort_));
    EXPECT_FALSE(accepts(sftpPort_));
    EXPECT_EQ(serviceState("sftp").state, RunState::paused);
    unwatchServices();
    planDouble().ftpOptions = {"--refuse", "not today"};
    EXPECT_LT(VLIBServicectlStart("ftpd", 0), 0);
    planDouble().ftpOptions = {};
    ASSERT_EQ(messageOf(watchServices()), "");
    std::this_thread::sleep_for(milliseconds(1200));
    EXPECT_FALSE(accepts(ftpPort_)) << "whoever asked for the start has heard of its failure";
}

TEST_F(ServiceWatchTest, EndsAtOnceAndCanBeTakenUpAgain) {
    ASSERT_EQ(messageOf(watchServices()), "");
    ASSERT_EQ(messageOf(watchServices()), "") << "a second call is no second watch";
    // Between two of its looks lies half a second.
    milliseconds shortest = timeOf(unwatchServices);
    for (int i = 0; i < 4; ++i) {
        ASSERT_EQ(messageOf(watchServices()), "");
        shortest = std::min(shortest, timeOf(unwatchServices));
    }
    EXPECT_LT(shortest, milliseconds(400));
    unwatchServices();
    const DaemonState former = serviceState("ftpd");
    kill(former.supervisor);
    std::this_thread::sleep_for(milliseconds(800));
    EXPECT_TRUE(isAlive(former.daemon)) << "nobody watches";
    ASSERT_EQ(messageOf(watchServices()), "");
    EXPECT_TRUE(waitUntil([&] { return isRestored("ftpd", former); }, promised_));
}

} // namespace
} // namespace velt::test
