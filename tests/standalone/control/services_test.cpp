// The service control of the contract, over real processes.
#include "platform/sftp.h"
#include "standalone/core/effects.h"
#include "standalone/standalone.h"
#include "tests/standalone/control/services_fixture.h"
#include "tests/support/ports.h"
#include "tests/support/waiting.h"

#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <csignal>
#include <thread>

namespace velt::test {
namespace {

using std::chrono::milliseconds;
using std::chrono::seconds;

TEST_F(ServicesTest, UnknownNamesFailWithASentence) {
    for (const char* name : {"", "ftp", "ssh", "../ftpd", "ftpd\n", static_cast<const char*>(nullptr)}) {
        for (const auto& operation :
             {VLIBServicectlStart, VLIBServicectlStop, VLIBServiceStart, VLIBServiceStop}) {
            clearLastError();
            EXPECT_LT(operation(name, 0), 0);
            EXPECT_NE(lastErrorSentence().find("There is no service"), std::string::npos)
                << lastErrorSentence();
        }
        EXPECT_LT(VLIBServicePause(name), 0);
        EXPECT_LT(VLIBServiceResume(name), 0);
        EXPECT_LT(VLIBServicecfgRunKeySet(name, 1), 0);
        EXPECT_EQ(VLIBServiceIsEnabled(name), 0);
    }
}

TEST_F(ServicesTest, APortThatIsJustBeingGivenUpIsWaitedFor) {
    auto other = std::make_unique<Listener>(ftpPort_);
    std::thread former([&other] {
        std::this_thread::sleep_for(milliseconds(50));
        other.reset();
    });
    EXPECT_EQ(messageOf(SupervisedDaemon(ftpDaemon).start(testOrder(ftpPort_, "next"))), "");
    former.join();
}

TEST_F(ServicesTest, EnabledMeansTheStoredFlags) {
    for (const int flags : {0, plain, tls, plain | tls, 4}) {
        storeFtp(flags);
        EXPECT_EQ(VLIBServiceIsEnabled("ftpd") != 0, (flags & plain) != 0);
        EXPECT_EQ(VLIBServiceIsEnabled("ftpd-pure") != 0, (flags & plain) != 0);
        EXPECT_EQ(VLIBServiceIsEnabled("ftpd-ssl") != 0, (flags & tls) != 0);
    }
    EXPECT_EQ(VLIBServiceIsEnabled("sftp"), 0);
    storeSftp(true);
    EXPECT_NE(VLIBServiceIsEnabled("sftp"), 0);
}

TEST_F(ServicesTest, TheThreeFtpNamesAreOneDaemon) {
    storeFtp(plain | tls);
    ASSERT_EQ(VLIBServicectlStart("ftpd-pure", 0), 0) << lastErrorSentence();
    const ProcessId daemon = daemonOf("ftpd");
    EXPECT_TRUE(accepts(ftpPort_));
    EXPECT_EQ(VLIBServicectlStart("ftpd-ssl", 0), 0);
    EXPECT_EQ(VLIBServicectlStart("ftpd", 0), 0);
    EXPECT_EQ(daemonOf("ftpd"), daemon);
    EXPECT_EQ(daemonOf("ftpd-ssl"), daemon);
    for (const char* name : {"ftpd-pure", "ftpd-ssl", "ftpd"}) {
        ASSERT_EQ(VLIBServicectlStart("ftpd", 0), 0) << lastErrorSentence();
        EXPECT_EQ(VLIBServicectlStop(name, 0), 0) << lastErrorSentence();
        EXPECT_FALSE(accepts(ftpPort_));
        EXPECT_EQ(VLIBServicectlStop(name, 0), 0) << "a second stop is no failure";
    }
}

TEST_F(ServicesTest, AChangedSettingIsTakenUpByTheNextStart) {
    ASSERT_EQ(VLIBServicectlStart("ftpd", 0), 0) << lastErrorSentence();
    const ProcessId daemon = daemonOf("ftpd");
    storeFtp(plain, 500);
    ASSERT_EQ(VLIBServicectlStart("ftpd", 0), 0) << lastErrorSentence();
    EXPECT_NE(daemonOf("ftpd"), daemon);
    EXPECT_TRUE(accepts(ftpPort_));
}

TEST_F(ServicesTest, TheOrderOfAChangeMovesThePort) {
    ASSERT_EQ(VLIBServicectlStart("ftpd", 0), 0) << lastErrorSentence();
    const int former = ftpPort_;
    ftpPort_ = freePort();
    storeFtp(plain | tls);
    for (const char* name : {"ftpd-pure", "ftpd-ssl", "ftpd"}) {
        ASSERT_EQ(VLIBServicectlStop(name, 0), 0) << lastErrorSentence();
    }
    EXPECT_EQ(VLIBServicecfgRunKeySet("ftpd", 2), 0);
    EXPECT_EQ(VLIBServicecfgRunKeySet("ftpd-ssl", 2), 0);
    EXPECT_EQ(runKey("ftpd"), "2\n");
    for (const char* name : {"ftpd-pure", "ftpd-ssl", "ftpd"}) {
        ASSERT_EQ(VLIBServicectlStart(name, 0), 0) << lastErrorSentence();
    }
    EXPECT_EQ(VLIBServicecfgRunKeySet("ftpd", 1), 0);
    EXPECT_EQ(runKey("ftpd"), "1\n");
    EXPECT_EQ(runKey("ftpd-ssl"), "2\n");
    EXPECT_FALSE(accepts(former));
    EXPECT_TRUE(accepts(ftpPort_));
}

TEST_F(ServicesTest, WithoutAFlagAStartLeavesNothingRunning) {
    storeFtp(0);
    EXPECT_EQ(VLIBServicectlStart("ftpd", 0), 0) << lastErrorSentence();
    EXPECT_FALSE(accepts(ftpPort_));
    storeFtp(tls);
    EXPECT_EQ(VLIBServicectlStart("ftpd", 0), 0) << lastErrorSentence();
    EXPECT_TRUE(accepts(ftpPort_));
    storeFtp(4);
    EXPECT_EQ(VLIBServicectlStart("ftpd-ssl", 0), 0) << lastErrorSentence();
    EXPECT_FALSE(accepts(ftpPort_));
}

TEST_F(ServicesTest, AStopKeepsTheStoredSettingsAndMarksTheRunKey) {
    ASSERT_EQ(VLIBServiceStart("ftpd", 0), 0) << lastErrorSentence();
    EXPECT_EQ(runKey("ftpd"), "1\n");
    ASSERT_EQ(VLIBServiceStop("ftpd", 0), 0) << lastErrorSentence();
    EXPECT_EQ(runKey("ftpd"), "2\n");
    EXPECT_NE(VLIBServiceIsEnabled("ftpd"), 0);
    EXPECT_EQ(VLIBServiceStart("ftpd", 0), 0) << lastErrorSentence();
    EXPECT_TRUE(accepts(ftpPort_));
}

TEST_F(ServicesTest, RunKeysAreOneOrTwo) {
    for (const int value : {-1, 0, 3}) {
        EXPECT_LT(VLIBServicecfgRunKeySet("ftpd", value), 0);
    }
    EXPECT_EQ(runKey("ftpd"), "none");
}

TEST_F(ServicesTest, ARestartIsRefusedWhileAnotherProgramHoldsTheNewPort) {
    ASSERT_EQ(VLIBServicectlStart("ftpd", 0), 0) << lastErrorSentence();
    const int former = ftpPort_;
    ftpPort_ = freePort();
    const Listener other(ftpPort_);
    storeFtp(plain);
    EXPECT_LT(VLIBServicectlStop("ftpd-pure", 0), 0);
    EXPECT_NE(lastErrorSentence().find("Port " + std::to_string(ftpPort_) + " is in use by " +
                                       std::string(program_invocation_short_name).substr(0, 15)),
              std::string::npos)
        << lastErrorSentence();
    EXPECT_TRUE(accepts(former)) << "the former daemon serves on";
    storeFtp(0);
    EXPECT_EQ(VLIBServicectlStop("ftpd-pure", 0), 0) << "to be off needs no port: " << lastErrorSentence();
}

TEST_F(ServicesTest, AStartOnATakenPortNamesTheHolder) {
    const Listener other(ftpPort_);
    EXPECT_LT(VLIBServicectlStart("ftpd", 0), 0);
    EXPECT_NE(lastErrorSentence().find("process " + std::to_string(::getpid())), std::string::npos)
        << lastErrorSentence();
}

TEST_F(ServicesTest, TheDaemonsOwnWordsReachTheCaller) {
    planDouble().ftpOptions = {"--refuse", "fatal: no such certificate"};
    EXPECT_LT(VLIBServicectlStart("ftpd", 0), 0);
    EXPECT_EQ(lastErrorSentence(), "The FTP daemon does not start: fatal: no such certificate.");
    planDouble().ftpOptions = {"--refuse",
                               "2026-11-21 07:19:56,458 vm proftpd[19] ::: Failed binding to port 21\n"
                               "2026-11-21 07:19:56,458 vm proftpd[19] ::: Check inetd"};
    EXPECT_LT(VLIBServicectlStart("ftpd", 0), 0);
    EXPECT_EQ(lastErrorSentence(), "The FTP daemon does not start: Failed binding to port 21.");
}

TEST_F(ServicesTest, ARefusedConfigurationLeavesTheDaemonAlone) {
    ASSERT_EQ(VLIBServicectlStart("ftpd", 0), 0) << lastErrorSentence();
    const ProcessId daemon = daemonOf("ftpd");
    planDouble().refuse = true;
    EXPECT_LT(VLIBServicectlStart("ftpd", 0), 0);
    EXPECT_EQ(lastErrorSentence(), "The configuration was refused.");
    EXPECT_EQ(daemonOf("ftpd"), daemon);
    clearLastError();
    EXPECT_LT(VLIBServicectlStop("ftpd", 0), 0) << "the first half of a restart";
    EXPECT_EQ(lastErrorSentence(), "The configuration was refused.");
    EXPECT_TRUE(accepts(ftpPort_));
}

TEST_F(ServicesTest, DamagedSettingsStartNothing) {
    ASSERT_TRUE(replaceFile(statePath("/etc/velt/ftp.conf"), "nonsense\n", 0644));
    EXPECT_LT(VLIBServicectlStart("ftpd", 0), 0);
    EXPECT_NE(lastErrorSentence().find("ftp.conf"), std::string::npos) << lastErrorSentence();
    EXPECT_EQ(VLIBServiceIsEnabled("ftpd"), 0);
    EXPECT_EQ(VLIBServicectlStop("ftpd", 0), 0) << lastErrorSentence();
}

TEST_F(ServicesTest, APauseOfSftpKeepsItsSessionsAndAResumeTakesTheNewPort) {
    storeSftp(true);
    ASSERT_EQ(VLIBServiceStart("sftp", 0), 0) << lastErrorSentence();
    EXPECT_NE(VELTSFTPIsAlive(), 0);
    Client client(sftpPort_);
    ASSERT_TRUE(client.isServed());

    ASSERT_EQ(VLIBServicePause("sftp"), 0) << lastErrorSentence();
    EXPECT_EQ(VELTSFTPIsAlive(), 0);
    EXPECT_FALSE(accepts(sftpPort_));
    sftpPort_ = freePort();
    storeSftp(true);
    ASSERT_EQ(VLIBServiceResume("sftp"), 0) << lastErrorSentence();
    EXPECT_NE(VELTSFTPIsAlive(), 0);
    EXPECT_TRUE(accepts(sftpPort_));
    EXPECT_TRUE(client.isServed());

    ASSERT_EQ(VLIBServicePause("sftp"), 0) << lastErrorSentence();
    ASSERT_EQ(VLIBServiceStop("sftp", 0), 0) << lastErrorSentence();
    EXPECT_FALSE(client.isServed());
    EXPECT_EQ(VELTSFTPIsAlive(), 0);
}

TEST_F(ServicesTest, AResumeOnATakenPortLeavesSftpPaused) {
    ASSERT_EQ(VLIBServiceStart("sftp", 0), 0) << lastErrorSentence();
    ASSERT_EQ(VLIBServicePause("sftp"), 0) << lastErrorSentence();
    const Listener other(sftpPort_);
    EXPECT_LT(VLIBServiceResume("sftp"), 0);
    EXPECT_NE(lastErrorSentence().find("is in use by"), std::string::npos) << lastErrorSentence();
    EXPECT_EQ(serviceState("sftp").state, RunState::paused);
}

TEST_F(ServicesTest, SftpThatIsDownCanBePausedAndResumed) {
    EXPECT_EQ(VLIBServicePause("sftp"), 0) << lastErrorSentence();
    EXPECT_EQ(VLIBServiceResume("sftp"), 0) << lastErrorSentence();
    EXPECT_NE(VELTSFTPIsAlive(), 0);
}

TEST_F(ServicesTest, FtpCannotBePaused) {
    ASSERT_EQ(VLIBServicectlStart("ftpd", 0), 0) << lastErrorSentence();
    EXPECT_LT(VLIBServicePause("ftpd"), 0);
    EXPECT_NE(lastErrorSentence().find("cannot be paused"), std::string::npos);
    EXPECT_TRUE(accepts(ftpPort_));
}

TEST_F(ServicesTest, AliveIsTheProcessAndNotItsFile) {
    ASSERT_EQ(VLIBServiceStart("sftp", 0), 0) << lastErrorSentence();
    const DaemonState state = serviceState("sftp");
    signalProcess(state.supervisor, SIGKILL);
    ASSERT_TRUE(waitUntil([&] { return !isAlive(state.supervisor); }, patience));
    EXPECT_NE(VELTSFTPIsAlive(), 0);
    signalProcess(state.daemon, SIGKILL);
    ASSERT_TRUE(waitUntil([&] { return !isAlive(state.daemon); }, patience));
    EXPECT_EQ(VELTSFTPIsAlive(), 0);
}

TEST_F(ServicesTest, WhatASupervisorWritesIsChangedByItsUserAlone) {
    const mode_t former = ::umask(0);
    EXPECT_EQ(VLIBServiceStart("sftp", 0), 0) << lastErrorSentence();
    ::umask(former);
    for (const char* file : {"run/velt/sftp.state", "run/velt/sftp.lock", "run/velt/sftp.sock"}) {
        struct stat status {};
        ASSERT_EQ(::stat((root_ / file).c_str(), &status), 0) << file;
        EXPECT_EQ(status.st_mode & (S_IWGRP | S_IWOTH), 0U) << file;
    }
}

TEST_F(ServicesTest, AfterABootWhatIsEnabledStarts) {
    storeFtp(tls);
    storeSftp(true);
    ASSERT_EQ(messageOf(startEnabledServices()), "");
    EXPECT_TRUE(accepts(ftpPort_));
    EXPECT_TRUE(accepts(sftpPort_));
    const ProcessId ftp = daemonOf("ftpd");
    storeSftp(false);
    ASSERT_EQ(messageOf(startEnabledServices()), "");
    EXPECT_EQ(daemonOf("ftpd"), ftp) << "what runs already is left alone";
    EXPECT_FALSE(accepts(sftpPort_));
}

TEST_F(ServicesTest, AfterABootOneThatFailsDoesNotHinderTheOther) {
    storeSftp(true);
    planDouble().ftpOptions = {"--refuse", "not today"};
    const std::string refusal = messageOf(startEnabledServices());
    EXPECT_NE(refusal.find("not today"), std::string::npos) << refusal;
    EXPECT_TRUE(accepts(sftpPort_));
}

TEST_F(ServicesTest, OfTwoFailuresTheFirstIsTold) {
    storeSftp(true);
    planDouble().ftpOptions = {"--refuse", "not today"};
    planDouble().sftpOptions = {"--refuse", "not tomorrow"};
    for (const std::string& refusal :
         {messageOf(startEnabledServices()), messageOf(restartServices(SessionPolicy::keep))}) {
        EXPECT_NE(refusal.find("not today"), std::string::npos) << refusal;
        EXPECT_EQ(refusal.find("not tomorrow"), std::string::npos) << refusal;
    }
}

TEST_F(ServicesTest, AllAreStoppedAndStartAgainAsTheyWere) {
    storeFtp(tls);
    storeSftp(true);
    ASSERT_EQ(messageOf(startEnabledServices()), "");
    ASSERT_EQ(messageOf(stopServices()), "");
    EXPECT_FALSE(accepts(ftpPort_));
    EXPECT_FALSE(accepts(sftpPort_));
    EXPECT_EQ(messageOf(stopServices()), "") << "nothing runs";
    ASSERT_EQ(messageOf(startEnabledServices()), "");
    EXPECT_TRUE(accepts(ftpPort_));
    EXPECT_TRUE(accepts(sftpPort_));
}

TEST_F(ServicesTest, EveryOperationIsAnEffectThatCanBeListedInstead) {
    std::vector<std::string> listed;
    setEffectHook([&listed](Effect effect, std::string_view subject) {
        listed.push_back(std::string(effectName(effect)) + " " + std::string(subject));
        return EffectDecision(Result<>());
    });
    EXPECT_EQ(VLIBServicectlStop("ftpd-pure", 0), 0);
    EXPECT_EQ(VLIBServicecfgRunKeySet("ftpd", 2), 0);
    EXPECT_EQ(VLIBServicectlStart("ftpd-ssl", 0), 0);
    EXPECT_EQ(VLIBServiceStop("ftpd", 0), 0);
    EXPECT_EQ(VLIBServiceStart("sftp", 0), 0);
    EXPECT_EQ(VLIBServicePause("sftp"), 0);
    EXPECT_EQ(VLIBServiceResume("sftp"), 0);
    const std::vector<std::string> expected{"stop ftpd-pure", "run key ftpd", "start ftpd-ssl",
                                            "stop ftpd",      "run key ftpd", "start sftp",
                                            "run key sftp",   "stop sftp",    "start sftp"};
    EXPECT_EQ(listed, expected);
    EXPECT_FALSE(accepts(ftpPort_));
    EXPECT_EQ(runKey("ftpd"), "none");
}

TEST_F(ServicesTest, ThreadsThatStartAtOnceMakeOneDaemon) {
    std::vector<std::thread> threads;
    std::vector<int> results(4, -1);
    for (int& result : results) {
        threads.emplace_back([&result] { result = VLIBServicectlStart("ftpd", 0); });
    }
    for (std::thread& thread : threads) {
        thread.join();
    }
    EXPECT_EQ(results, std::vector<int>(4, 0));
    EXPECT_EQ(leftProcesses().size(), 2U) << "a supervisor and its daemon";
}

TEST_F(ServicesTest, ProcessesThatStartAtOnceMakeOneDaemon) {
    std::vector<pid_t> children;
    for (int count = 0; count < 4; ++count) {
        children.push_back(::fork());
        if (children.back() == 0) {
            ::_exit(VLIBServicectlStart("sftp", 0) == 0 ? 0 : 1);
        }
    }
    for (const pid_t child : children) {
        int status = -1;
        ASSERT_EQ(::waitpid(child, &status, 0), child);
        EXPECT_EQ(status, 0);
    }
    EXPECT_EQ(leftProcesses().size(), 2U) << "a supervisor and its daemon";
    EXPECT_NE(VELTSFTPIsAlive(), 0);
}

} // namespace
} // namespace velt::test
