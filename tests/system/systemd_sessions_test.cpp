// SFTP sessions under a real systemd, whose login manager moves them out of the unit; other servers; a boot.
#include "ftp/ftp_library.h"
#include "platform/service.h"
#include "platform/sftp.h"
#include "standalone/contract/last_error.h"
#include "standalone/control/systemd_unit.h"
#include "standalone/standalone.h"
#include "tests/support/files.h"
#include "tests/support/waiting.h"
#include "tests/system/support/systemd_services.h"

#include <csignal>
#include <filesystem>
#include <fstream>

namespace velt::test {
namespace {
namespace fs = std::filesystem;
using std::chrono::seconds;

void startSftp() {
    openMachine();
    letAliceInByKey();
    storeFtp(0, 2121, true);
    storeSftp(true);
    ASSERT_EQ(VLIBServiceStart("sftp", 0), 0) << lastErrorSentence();
    ASSERT_NE(VELTSFTPIsAlive(), 0);
}

TEST_F(UnderSystemd, aTransferOutlivesAPauseAndAMove) {
    inside([] {
        startSftp();
        SlowTransfer transfer(2222);
        EXPECT_EQ(VLIBServicePause("sftp"), 0) << lastErrorSentence();
        EXPECT_EQ(VELTSFTPIsAlive(), 0);
        EXPECT_NE(logInBySftp(2222).exitCode, 0);
        EXPECT_EQ(unitProperty("velt-sftp.service", "StatusText"), "paused: open sessions continue");
        storeSftp(true, 2223);
        EXPECT_EQ(VLIBServiceResume("sftp"), 0) << lastErrorSentence();
        EXPECT_EQ(logInBySftp(2223).exitCode, 0);
        EXPECT_TRUE(transfer.succeeds());
    });
}

TEST_F(UnderSystemd, aStopEndsSessionsWhereverTheyWereMoved) {
    inside([] {
        startSftp();
        for (const bool paused : {false, true}) {
            SlowTransfer transfer(2222);
            const DaemonState state = serviceState("sftp");
            if (fs::exists("/lib/systemd/system/systemd-logind.service")) {
                const auto sessions = descendantsOf(state.daemon.pid);
                ASSERT_FALSE(sessions.empty());
                const std::string place = contentsOf("/proc/" + std::to_string(sessions[0].pid) + "/cgroup");
                EXPECT_NE(place.find("/session-"), std::string::npos)
                    << "not what this test is about: " << place;
            }
            if (paused) {
                EXPECT_EQ(VLIBServicePause("sftp"), 0) << lastErrorSentence();
            }
            EXPECT_EQ(VLIBServiceStop("sftp", 0), 0) << lastErrorSentence();
            EXPECT_FALSE(transfer.succeeds());
            EXPECT_NE(runProcess({"pidof", "sshd"}).exitCode, 0) << "a session goes on";
            EXPECT_EQ(unitState("velt-sftp.service"), "inactive");
            ASSERT_EQ(VLIBServiceStart("sftp", 0), 0) << lastErrorSentence();
        }
    });
}

TEST_F(UnderSystemd, aStopEndsTheSessionsOfAListenerThatCrashed) {
    inside([] {
        startSftp();
        SlowTransfer transfer(2222);
        const ProcessId listener = serviceState("sftp").daemon;
        signalProcess(listener, SIGKILL);
        ASSERT_TRUE(isBack("sftp", listener));
        EXPECT_EQ(VLIBServiceStop("sftp", 0), 0) << lastErrorSentence();
        EXPECT_FALSE(transfer.succeeds());
        EXPECT_NE(runProcess({"pidof", "sshd"}).exitCode, 0) << "a session goes on";
    });
}

TEST_F(UnderSystemd, aStopEndsTheSessionsOfASupervisorThatWasKilled) {
    inside([] {
        startSftp();
        SlowTransfer transfer(2222);
        const DaemonState before = serviceState("sftp");
        signalProcess(before.supervisor, SIGKILL);
        ASSERT_TRUE(isBack("sftp", before.daemon));
        EXPECT_EQ(VLIBServiceStop("sftp", 0), 0) << lastErrorSentence();
        EXPECT_FALSE(transfer.succeeds());
        EXPECT_NE(runProcess({"pidof", "sshd"}).exitCode, 0) << "a session goes on";
    });
}

/// The distribution's own server, which an administrator uses.
class BesideTheStockServer : public UnderSystemd {
protected:
    void SetUp() override {
        if (!fs::exists("/lib/systemd/system/ssh.service")) {
            GTEST_SKIP() << "the distribution's SSH server has no unit here";
        }
        UnderSystemd::SetUp();
    }

    static void startStockServer() {
        ASSERT_EQ(runProcess({"ssh-keygen", "-A"}).exitCode, 0);
        ASSERT_EQ(runProcess({"systemctl", "start", "ssh.service"}).exitCode, 0);
    }
};

TEST_F(BesideTheStockServer, itsPortIsRefusedAndItsSessionsAreLeftAlone) {
    inside([] {
        startSftp();
        startStockServer();
        SlowTransfer administrators(22);
        storeSftp(true, 22);
        EXPECT_LT(VLIBServiceStart("sftp", 0), 0);
        EXPECT_NE(lastErrorSentence().find("Port 22 is in use by sshd"), std::string::npos)
            << lastErrorSentence();
        EXPECT_EQ(logInBySftp(2222).exitCode, 0) << "the former port is served on";
        EXPECT_EQ(VLIBServiceStop("sftp", 0), 0) << lastErrorSentence();
        EXPECT_EQ(unitState("ssh.service"), "active");
        EXPECT_TRUE(administrators.succeeds());
    });
}

TEST_F(BesideTheStockServer, itsStopKeepsNobodyFromLoggingIn) {
    inside([] {
        startStockServer();
        startSftp();
        EXPECT_EQ(logInBySftp(2222).exitCode, 0);
        ASSERT_EQ(runProcess({"systemctl", "stop", "ssh.service"}).exitCode, 0);
        const ProcessResult login = logInBySftp(2222);
        EXPECT_EQ(login.exitCode, 0) << login.errors << runProcess({"journalctl", "-u", "velt-sftp"}).output;
    });
}

TEST_F(UnderSystemd, afterABootTheHostStartsWhatIsEnabled) {
    inside([] {
        openMachine();
        storeFtp(VELT_FTP_SERVICE_TLS | VELT_FTP_SERVICE_PLAIN);
        storeSftp(true);
        installAndEnableHost();
        EXPECT_TRUE(hostAnswers());
        EXPECT_EQ(fetchByFtp(), "alice");
        EXPECT_EQ(runProcess({"journalctl", "--unit=veltd", "--grep=did not start"}).exitCode, 1);
    });
    reboot();
    inside([] {
        openMachine();
        EXPECT_TRUE(hostAnswers());
        EXPECT_NE(VELTSFTPIsAlive(), 0);
        EXPECT_EQ(fetchByFtp(), "alice");
        const ProcessId ftp = serviceState("ftpd").daemon;
        const ProcessId sftp = serviceState("sftp").daemon;
        EXPECT_EQ(unitState("velt-ftpd.service"), "active");
        EXPECT_EQ(unitState("velt-sftp.service"), "active");

        ASSERT_EQ(runProcess({"systemctl", "restart", "veltd.service"}).exitCode, 0);
        EXPECT_TRUE(hostAnswers());
        EXPECT_EQ(fetchByFtp(), "alice");
        EXPECT_EQ(serviceState("ftpd").daemon, ftp) << "the services do not depend on the host";
        EXPECT_EQ(serviceState("sftp").daemon, sftp);
        storeSftp(false);
    });
    reboot();
    inside([] {
        openMachine();
        EXPECT_TRUE(hostAnswers());
        EXPECT_EQ(fetchByFtp(), "alice");
        EXPECT_EQ(VELTSFTPIsAlive(), 0);
        EXPECT_FALSE(fs::exists("/run/systemd/system/velt-sftp.service"));
    });
}

TEST_F(UnderSystemd, quotedWordsArriveAsTheyAre) {
    inside([] {
        const std::vector<std::string> words{"a b",
                                             "a\"b\\c",
                                             "%h $HOME ${HOME}",
                                             "a\nExecStart=/bin/x",
                                             "",
                                             ";",
                                             "gr\xc3\xbc\xc3\x9f",
                                             "# no comment",
                                             "\x01\t'",
                                             "\\",
                                             "-"};
        std::string line;
        std::string expected;
        for (const std::string& word : words) {
            line += " " + quoteUnitWord(word);
            expected += word + "|";
        }
        std::ofstream("/run/systemd/system/words.service")
            << "[Service]\nType=oneshot\nStandardOutput=file:/run/words\n"
            << "ExecStart=/usr/bin/printf \"%%s|\"" << line << '\n';
        EXPECT_EQ(runProcess({"systemctl", "start", "words.service"}).exitCode, 0);
        EXPECT_EQ(contentsOf("/run/words"), expected);
    });
}

} // namespace
} // namespace velt::test
