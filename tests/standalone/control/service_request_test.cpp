// Stops and starts within the frame of a request.
#include "standalone/control/service_request.h"

#include "standalone/control/service_overview.h"
#include "standalone/control/start_services.h"
#include "tests/standalone/control/services_fixture.h"
#include "tests/support/waiting.h"

#include <sys/wait.h>

#include <csignal>
#include <stdexcept>
#include <thread>

namespace velt::test {
namespace {

using Sessions = std::vector<ServiceSessions>;

class ServiceRequestTest : public ServicesTest {
protected:
    void SetUp() override {
        ServicesTest::SetUp();
        planDouble().ftpOptions = {"--share"};
        ASSERT_EQ(VLIBServicectlStart("ftpd", 0), 0) << lastErrorSentence();
    }

    /// Another setting, and what the module does about it.
    void changeFtp(int uploadRate) const {
        storeFtp(plain, uploadRate);
        ASSERT_EQ(VLIBServicectlStop("ftpd-pure", 0), 0) << lastErrorSentence();
        ASSERT_EQ(VLIBServicectlStop("ftpd", 0), 0) << lastErrorSentence();
        ASSERT_EQ(VLIBServicectlStart("ftpd-pure", 0), 0) << lastErrorSentence();
        ASSERT_EQ(VLIBServicectlStart("ftpd", 0), 0) << lastErrorSentence();
    }

    static Sessions restart() {
        const auto sessions = restartServices(SessionPolicy::keep);
        EXPECT_EQ(messageOf(sessions), "");
        return sessions.valueOr({});
    }

    static Sessions end(ServiceRequest& request) {
        const auto sessions = request.finish();
        EXPECT_EQ(messageOf(sessions), "");
        return sessions.valueOr({});
    }
};

TEST_F(ServiceRequestTest, AStopThatAStartFollowsHandsOver) {
    Client client(ftpPort_);
    ASSERT_TRUE(client.isServed());
    const ProcessId former = daemonOf("ftpd");
    const ProcessId supervisor = serviceState("ftpd").supervisor;
    ServiceRequest request;
    changeFtp(100);
    EXPECT_EQ(end(request), (Sessions{{"ftp", 0, 1}}));
    EXPECT_TRUE(client.isServed());
    EXPECT_NE(daemonOf("ftpd"), former);
    EXPECT_EQ(serviceState("ftpd").supervisor, supervisor);
    EXPECT_TRUE(Client(ftpPort_).isServed());
}

TEST_F(ServiceRequestTest, WithoutARequestAStopIsAStop) {
    Client client(ftpPort_);
    ASSERT_TRUE(client.isServed());
    changeFtp(100);
    EXPECT_FALSE(client.isServed());
}

TEST_F(ServiceRequestTest, ARestartThatChangesNothingDisturbsNobody) {
    const ProcessId daemon = daemonOf("ftpd");
    ServiceRequest request;
    changeFtp(0);
    EXPECT_EQ(end(request), Sessions());
    EXPECT_EQ(daemonOf("ftpd"), daemon);
}

TEST_F(ServiceRequestTest, SessionsEndWhenTheChangeTakesTheirRights) {
    planDouble().takesRights = true;
    Client client(ftpPort_);
    ASSERT_TRUE(client.isServed());
    ServiceRequest request;
    changeFtp(100);
    EXPECT_EQ(end(request), (Sessions{{"ftp", 1, 0}}));
    EXPECT_FALSE(client.isServed());
    EXPECT_TRUE(Client(ftpPort_).isServed());
}

TEST_F(ServiceRequestTest, SessionsAreKeptIfThatIsWanted) {
    planDouble().takesRights = true;
    Client client(ftpPort_);
    ASSERT_TRUE(client.isServed());
    ServiceRequest request(SessionPolicy::keep);
    changeFtp(100);
    EXPECT_EQ(end(request), (Sessions{{"ftp", 0, 1}}));
    EXPECT_TRUE(client.isServed());
}

TEST_F(ServiceRequestTest, SessionsEndIfThatIsWanted) {
    for (const int rate : {100, 100}) { // the second time without another daemon
        Client client(ftpPort_);
        ASSERT_TRUE(client.isServed());
        ServiceRequest request(SessionPolicy::end);
        changeFtp(rate);
        EXPECT_EQ(end(request), (Sessions{{"ftp", 1, 0}}));
        EXPECT_FALSE(client.isServed());
    }
}

TEST_F(ServiceRequestTest, AStopThatNoStartFollowsIsDoneAtTheEnd) {
    Client client(ftpPort_);
    ASSERT_TRUE(client.isServed());
    ServiceRequest request;
    ASSERT_EQ(VLIBServicectlStop("ftpd", 0), 0);
    EXPECT_TRUE(client.isServed());
    EXPECT_EQ(end(request), (Sessions{{"ftp", 1, 0}}));
    EXPECT_FALSE(client.isServed());
    EXPECT_FALSE(accepts(ftpPort_));
    EXPECT_TRUE(leftProcesses().empty());
}

TEST_F(ServiceRequestTest, TheEndOfARequestComesAfterAnExceptionAsWell) {
    try {
        const ServiceRequest request;
        ASSERT_EQ(VLIBServicectlStop("ftpd", 0), 0);
        throw std::runtime_error("broken");
    } catch (const std::runtime_error&) {
    }
    EXPECT_FALSE(accepts(ftpPort_));
    ASSERT_EQ(VLIBServicectlStart("ftpd", 0), 0);
    ASSERT_EQ(VLIBServicectlStop("ftpd", 0), 0);
    EXPECT_FALSE(accepts(ftpPort_)) << "the request is over";
}

TEST_F(ServiceRequestTest, WhatIsSwitchedOffIsStoppedAtOnce) {
    ServiceRequest request;
    storeFtp(0);
    ASSERT_EQ(VLIBServicectlStop("ftpd", 0), 0) << lastErrorSentence();
    EXPECT_FALSE(accepts(ftpPort_));
    EXPECT_EQ(end(request), Sessions());
}

TEST_F(ServiceRequestTest, AKilledProcessLeavesWhatTheNextStartPutsRight) {
    const pid_t host = ::fork();
    if (host == 0) {
        const ServiceRequest request;
        storeFtp(plain, 100);
        const int stopped = VLIBServicectlStop("ftpd", 0);
        storeFtp(0);
        ::raise(stopped == 0 ? SIGKILL : SIGTERM);
    }
    int status = 0;
    ASSERT_EQ(::waitpid(host, &status, 0), host);
    ASSERT_TRUE(WIFSIGNALED(status) && WTERMSIG(status) == SIGKILL);
    EXPECT_TRUE(accepts(ftpPort_));
    ASSERT_EQ(messageOf(startEnabledServices()), "");
    EXPECT_FALSE(accepts(ftpPort_));
}

TEST_F(ServiceRequestTest, ADaemonThatDoesNotComeUpLeavesTheFormerOneServing) {
    Client client(ftpPort_);
    ASSERT_TRUE(client.isServed());
    const ProcessId daemon = daemonOf("ftpd");
    ServiceRequest request;
    planDouble().ftpOptions = {"--share", "--refuse", "fatal: not today"};
    storeFtp(plain, 100);
    ASSERT_EQ(VLIBServicectlStop("ftpd", 0), 0) << lastErrorSentence();
    EXPECT_LT(VLIBServicectlStart("ftpd", 0), 0);
    EXPECT_EQ(lastErrorSentence(), "The FTP daemon does not start: fatal: not today.");
    EXPECT_EQ(end(request), Sessions());
    EXPECT_EQ(daemonOf("ftpd"), daemon);
    EXPECT_TRUE(client.isServed());
    EXPECT_TRUE(Client(ftpPort_).isServed());
    const auto down = servicesDown();
    ASSERT_EQ(down.size(), 1U);
    EXPECT_TRUE(down.front().servesFormerSettings);
    EXPECT_EQ(down.front().reason, "The FTP daemon does not start: fatal: not today.");
}

TEST_F(ServiceRequestTest, OneWithinAnotherIsAPartOfIt) {
    const ProcessId former = daemonOf("ftpd");
    ServiceRequest outer(SessionPolicy::keep);
    {
        ServiceRequest inner(SessionPolicy::end);
        storeFtp(plain, 100);
        ASSERT_EQ(VLIBServicectlStop("ftpd", 0), 0) << lastErrorSentence();
        EXPECT_EQ(end(inner), Sessions());
    }
    EXPECT_EQ(daemonOf("ftpd"), former);
    EXPECT_TRUE(accepts(ftpPort_));
    Client client(ftpPort_);
    ASSERT_TRUE(client.isServed());
    ASSERT_EQ(VLIBServicectlStart("ftpd", 0), 0) << lastErrorSentence();
    EXPECT_EQ(end(outer), (Sessions{{"ftp", 0, 1}}));
    EXPECT_NE(daemonOf("ftpd"), former);
    EXPECT_TRUE(client.isServed());
}

TEST_F(ServiceRequestTest, APauseThatAResumeFollowsMovesTheListener) {
    storeSftp(true);
    ASSERT_EQ(VLIBServiceStart("sftp", 0), 0) << lastErrorSentence();
    Client client(sftpPort_);
    ASSERT_TRUE(client.isServed());
    const int formerPort = sftpPort_;
    ServiceRequest request;
    ASSERT_EQ(VLIBServicePause("sftp"), 0) << lastErrorSentence();
    EXPECT_TRUE(accepts(formerPort));
    sftpPort_ = freePort();
    storeSftp(true);
    ASSERT_EQ(VLIBServiceResume("sftp"), 0) << lastErrorSentence();
    EXPECT_FALSE(accepts(formerPort));
    EXPECT_TRUE(accepts(sftpPort_));
    EXPECT_TRUE(client.isServed());
    EXPECT_EQ(end(request), (Sessions{{"sftp", 0, 1}}));
}

TEST_F(ServiceRequestTest, APauseThatNothingFollowsIsAPause) {
    storeSftp(true);
    ASSERT_EQ(VLIBServiceStart("sftp", 0), 0) << lastErrorSentence();
    Client client(sftpPort_);
    ASSERT_TRUE(client.isServed());
    ServiceRequest request;
    ASSERT_EQ(VLIBServicePause("sftp"), 0) << lastErrorSentence();
    EXPECT_EQ(end(request), (Sessions{{"sftp", 0, 1}}));
    EXPECT_FALSE(accepts(sftpPort_));
    EXPECT_TRUE(client.isServed());
    EXPECT_EQ(serviceState("sftp").state, RunState::paused);
}

TEST_F(ServiceRequestTest, ARestartReplacesDaemonsWhateverTheyRunWith) {
    storeSftp(true);
    ASSERT_EQ(VLIBServiceStart("sftp", 0), 0) << lastErrorSentence();
    Client ftp(ftpPort_);
    Client sftp(sftpPort_);
    ASSERT_TRUE(ftp.isServed() && sftp.isServed());
    ProcessId ftpDaemonBefore = daemonOf("ftpd");
    ProcessId sftpDaemonBefore = daemonOf("sftp");
    EXPECT_EQ(restart(), (Sessions{{"ftp", 0, 1}, {"sftp", 0, 1}})) << "they may be stuck";
    EXPECT_NE(daemonOf("ftpd"), ftpDaemonBefore);
    EXPECT_NE(daemonOf("sftp"), sftpDaemonBefore);
    ftpDaemonBefore = daemonOf("ftpd");
    sftpDaemonBefore = daemonOf("sftp");
    planDouble().ftpOptions = {"--share", "--delay", "1"};
    planDouble().sftpOptions = {"--delay", "1"};
    planDouble().takesRights = true;
    EXPECT_EQ(restart(), (Sessions{{"ftp", 0, 1}, {"sftp", 0, 1}}));
    EXPECT_NE(daemonOf("ftpd"), ftpDaemonBefore);
    EXPECT_NE(daemonOf("sftp"), sftpDaemonBefore);
    EXPECT_TRUE(ftp.isServed() && sftp.isServed());
}

TEST_F(ServiceRequestTest, ARestartStartsWhatIsOnAlone) {
    ASSERT_EQ(VLIBServicectlStop("ftpd", 0), 0) << lastErrorSentence();
    EXPECT_EQ(restart(), (Sessions{{"ftp", 0, 0}}));
    EXPECT_TRUE(accepts(ftpPort_));
    EXPECT_FALSE(accepts(sftpPort_));
}

TEST_F(ServiceRequestTest, IsThatOfItsThread) {
    ServiceRequest request;
    std::thread([this] {
        EXPECT_EQ(VLIBServicectlStop("ftpd", 0), 0);
        EXPECT_FALSE(accepts(ftpPort_));
    }).join();
    EXPECT_EQ(end(request), Sessions());
}

} // namespace
} // namespace velt::test
