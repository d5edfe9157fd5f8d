// Service control over the real daemons, seen by real clients.
#include "ftp/ftp_library.h"
#include "platform/service.h"
#include "platform/sftp.h"
#include "standalone/contract/last_error.h"
#include "standalone/core/state_root.h"
#include "standalone/standalone.h"
#include "tests/standalone/support/daemon_states.h"
#include "tests/support/files.h"
#include "tests/support/result.h"
#include "tests/support/run_program.h"
#include "tests/system/support/ftp_service.h"
#include "tests/system/support/private_world.h"
#include "tests/system/support/sftp_session.h"

#include <gtest/gtest.h>

#include <linux/capability.h>
#include <netinet/in.h>
#include <sys/prctl.h>
#include <sys/socket.h>
#include <sys/wait.h>
#include <unistd.h>

#include <chrono>
#include <csignal>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <string>
#include <thread>

namespace velt::test {
namespace {
namespace fs = std::filesystem;
using std::chrono::milliseconds;
using std::chrono::seconds;

/// Listens on the port as another program would.
class TakenPort {
public:
    explicit TakenPort(int atPort) : descriptor_(::socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0)) {
        const int on = 1; // ended connections of a former test do not count
        ::setsockopt(descriptor_, SOL_SOCKET, SO_REUSEADDR, &on, sizeof on);
        sockaddr_in address{};
        address.sin_family = AF_INET;
        address.sin_port = htons(static_cast<in_port_t>(atPort));
        EXPECT_EQ(::bind(descriptor_, reinterpret_cast<const sockaddr*>(&address), sizeof address), 0);
        EXPECT_EQ(::listen(descriptor_, 1), 0);
    }
    ~TakenPort() { ::close(descriptor_); }
    TakenPort(const TakenPort&) = delete;
    TakenPort& operator=(const TakenPort&) = delete;

private:
    int descriptor_;
};

class ControlledServices : public FtpService {
protected:
    void TearDown() override {
        if (whyNoWorld().empty()) {
            EXPECT_EQ(VLIBServiceStop("ftpd", 0), 0) << lastErrorSentence();
            EXPECT_EQ(VLIBServiceStop("sftp", 0), 0) << lastErrorSentence();
        }
        FtpService::TearDown();
    }

    void storeAndStart(int flags, int atPort) {
        std::snprintf(record.portnum, sizeof record.portnum, "%d", atPort);
        record.service_flags = flags;
        ASSERT_EQ(VELTFTPConfSet(record), 0) << lastErrorSentence();
        for (const char* name : {"ftpd-pure", "ftpd-ssl", "ftpd"}) {
            ASSERT_EQ(VLIBServicectlStop(name, 0), 0) << lastErrorSentence();
        }
        ASSERT_EQ(VLIBServicectlStart("ftpd", 0), 0) << lastErrorSentence();
    }

    static bool servesFtp(int atPort) {
        return curl({"--silent", "--user", "alice:alice-secret",
                     "ftp://127.0.0.1:" + std::to_string(atPort) + "/home-of"})
                   .output == "alice";
    }

    static bool isBack(const std::string& service, const ProcessId& former) {
        const auto end = std::chrono::steady_clock::now() + seconds(2);
        while (std::chrono::steady_clock::now() < end) {
            const DaemonState state = serviceState(service);
            if (state.daemon != former && isServing(state)) {
                return true;
            }
            std::this_thread::sleep_for(milliseconds(5));
        }
        return false;
    }
};

TEST_F(ControlledServices, ftpStartsMovesAndStops) {
    storeAndStart(VELT_FTP_SERVICE_PLAIN, 2121);
    EXPECT_TRUE(servesFtp(2121));
    const ProcessId daemon = serviceState("ftpd").daemon;
    EXPECT_EQ(VLIBServicectlStart("ftpd-pure", 0), 0) << lastErrorSentence();
    EXPECT_EQ(serviceState("ftpd").daemon, daemon) << "nothing changed";
    storeAndStart(VELT_FTP_SERVICE_PLAIN | VELT_FTP_SERVICE_TLS, 2123);
    EXPECT_TRUE(servesFtp(2123));
    EXPECT_FALSE(servesFtp(2121));
    EXPECT_EQ(VLIBServicectlStop("ftpd", 0), 0) << lastErrorSentence();
    EXPECT_FALSE(servesFtp(2123));
}

TEST_F(ControlledServices, aKilledFtpDaemonIsUpAgainWithinTwoSeconds) {
    storeAndStart(VELT_FTP_SERVICE_PLAIN, 2121);
    const ProcessId daemon = serviceState("ftpd").daemon;
    signalProcess(daemon, SIGKILL);
    EXPECT_TRUE(isBack("ftpd", daemon));
    EXPECT_TRUE(servesFtp(2121));
}

TEST_F(ControlledServices, aRefusedMoveLeavesADaemonThatComesBackAsItWas) {
    addShare("music", "music", Access::none);
    record.user_chroot = 0;
    storeAndStart(VELT_FTP_SERVICE_PLAIN, 2121);
    const ProcessId daemon = serviceState("ftpd").daemon;
    addShare("films", "films", Access::none);
    std::strcpy(record.portnum, "2123");
    ASSERT_EQ(VELTFTPConfSet(record), 0) << lastErrorSentence();
    {
        const TakenPort taken(2123);
        EXPECT_LT(VLIBServicectlStart("ftpd", 0), 0);
        EXPECT_EQ(serviceState("ftpd").daemon, daemon);
        signalProcess(daemon, SIGKILL);
        EXPECT_TRUE(isBack("ftpd", daemon));
        const ProcessResult listing =
            curl({"--list-only", "--user", "alice:alice-secret", "ftp://127.0.0.1:2121//"});
        EXPECT_EQ(listing.output, "films\nmusic\n") << "the shares are those of now in any case";
    }
    EXPECT_EQ(VLIBServicectlStart("ftpd", 0), 0) << lastErrorSentence();
    EXPECT_TRUE(isServing(serviceState("ftpd")));
}

TEST_F(ControlledServices, ftpDoesNotStartWhereSessionsCannotHaveMountsOfTheirOwn) {
    record.service_flags = VELT_FTP_SERVICE_PLAIN;
    ASSERT_EQ(VELTFTPConfSet(record), 0) << lastErrorSentence();
    // Root without the right to make mounts, as in many containers.
    const pid_t child = fork();
    if (child == 0) {
        const bool refused =
            prctl(PR_CAPBSET_DROP, CAP_SYS_ADMIN, 0, 0, 0) == 0 && VLIBServiceStart("ftpd", 0) < 0;
        const bool told = lastErrorSentence() ==
                          "The FTP daemon does not start: FTP sessions cannot be confined here: cannot make "
                          "a mount namespace: Operation not permitted.";
        _exit(refused && told ? 0 : 1);
    }
    int status = -1;
    ASSERT_EQ(waitpid(child, &status, 0), child);
    EXPECT_EQ(status, 0);
    EXPECT_EQ(VLIBServiceStart("ftpd", 0), 0) << lastErrorSentence();
}

TEST_F(ControlledServices, unconfinedUsersHaveTheirShareRootThroughTheSupervisor) {
    addShare("music", "music", Access::none);
    record.user_chroot = 0;
    storeAndStart(VELT_FTP_SERVICE_PLAIN, 2121);
    EXPECT_TRUE(isServing(serviceState("ftpd")));
    const ProcessResult listing =
        curl({"--silent", "--list-only", "--user", "alice:alice-secret", "ftp://127.0.0.1:2121//"});
    EXPECT_NE(listing.output.find("music"), std::string::npos) << listing.output;
}

class ControlledSftp : public ControlledServices {
protected:
    void SetUp() override {
        ControlledServices::SetUp();
        if (IsSkipped()) {
            return;
        }
        ASSERT_EQ(VELTSFTPConfigSet(1, 2222), 0) << lastErrorSentence();
        ASSERT_EQ(
            runProcess({"ssh-keygen", "-q", "-t", "ed25519", "-N", "", "-f", "/mnt/control-key"}).exitCode,
            0);
        fs::create_directories("/mnt/home/alice/.ssh");
        writeFile("/mnt/home/alice/.ssh/authorized_keys", contentsOf("/mnt/control-key.pub"), aliceId);
        ASSERT_EQ(::chown("/mnt/home/alice/.ssh", aliceId, aliceId), 0);
        writeFile("/mnt/home/alice/large", std::string(300000, 'x'), aliceId);
    }

    void TearDown() override {
        ControlledServices::TearDown();
        for (const char* file : {"/mnt/control-key", "/mnt/control-key.pub", "/mnt/control-got"}) {
            fs::remove(file);
        }
    }

    /// Fetches the large file, at 800 Kbit/s in three seconds.
    static ProcessResult fetchSlowly(int atPort) {
        return runProcess({"sftp", "-F", "/dev/null", "-i", "/mnt/control-key", "-l", "800", "-P",
                           std::to_string(atPort), "-o", "BatchMode=yes", "-o", "StrictHostKeyChecking=no",
                           "-o", "UserKnownHostsFile=/dev/null", "-b", "-", "alice@127.0.0.1"},
                          "get large /mnt/control-got\n", seconds(30));
    }
};

TEST_F(ControlledSftp, aTransferOutlivesAPauseAndAMove) {
    ASSERT_EQ(VLIBServiceStart("sftp", 0), 0) << lastErrorSentence();
    EXPECT_NE(VELTSFTPIsAlive(), 0);
    ProcessResult transfer;
    std::thread client([&transfer] { transfer = fetchSlowly(2222); });
    std::this_thread::sleep_for(seconds(1));
    EXPECT_EQ(VLIBServicePause("sftp"), 0) << lastErrorSentence();
    EXPECT_EQ(VELTSFTPIsAlive(), 0);
    EXPECT_FALSE(serviceState("sftp").sessions.empty()) << "the transfer should still run";
    EXPECT_EQ(VELTSFTPConfigSet(1, 2223), 0) << lastErrorSentence();
    EXPECT_EQ(VLIBServiceResume("sftp"), 0) << lastErrorSentence();
    client.join();
    EXPECT_EQ(transfer.exitCode, 0) << transfer.errors;
    EXPECT_EQ(contentsOf("/mnt/control-got").size(), 300000U);
    EXPECT_NE(fetchSlowly(2222).exitCode, 0) << "the former port is closed";
    EXPECT_NE(VELTSFTPIsAlive(), 0);
}

TEST_F(ControlledSftp, followsWhatChangesOfFtpAndKeepsItsSessions) {
    ASSERT_EQ(VLIBServiceStart("sftp", 0), 0) << lastErrorSentence();
    SftpSession session(2222, "alice");
    ASSERT_EQ(session.send("masked", "x", sftpWrite | sftpMake, 0666), sftpGood);
    ASSERT_EQ(VELTFTPUmaskEnabledSet(false), 0) << lastErrorSentence();
    SftpSession later(2222, "alice");
    EXPECT_EQ(later.send("open", "x", sftpWrite | sftpMake, 0666), sftpGood);
    EXPECT_EQ(session.send("former", "x", sftpWrite | sftpMake, 0666), sftpGood);
    EXPECT_EQ(modeOf("/mnt/home/alice/masked"), 0644U);
    EXPECT_EQ(modeOf("/mnt/home/alice/open"), 0666U);
    EXPECT_EQ(modeOf("/mnt/home/alice/former"), 0644U) << "it keeps what it began with";
    const ProcessId listener = serviceState("sftp").daemon;
    ASSERT_EQ(VELTFTPFIPSEnabledSet(1), 0) << lastErrorSentence();
    EXPECT_NE(serviceState("sftp").daemon, listener);
    EXPECT_NE(fetchSlowly(2222).exitCode, 0) << "an Ed25519 key is none of the approved ones";
    EXPECT_TRUE(SftpSession(2222, "alice").isOpen()) << "a password with approved algorithms";
    EXPECT_EQ(session.receive("masked"), "x");
    ASSERT_EQ(VELTFTPFIPSEnabledSet(1), 0) << lastErrorSentence();
    ASSERT_EQ(VLIBServiceStop("sftp", 0), 0) << lastErrorSentence();
    ASSERT_EQ(VELTFTPFIPSEnabledSet(0), 0) << lastErrorSentence();
    EXPECT_EQ(VELTSFTPIsAlive(), 0) << "what does not run is not started";
}

TEST_F(ControlledSftp, aRefusedMoveLeavesADaemonThatComesBackAsItWas) {
    ASSERT_EQ(VLIBServiceStart("sftp", 0), 0) << lastErrorSentence();
    const ProcessId daemon = serviceState("sftp").daemon;
    ASSERT_EQ(VELTSFTPConfigSet(1, 2223), 0) << lastErrorSentence();
    const TakenPort taken(2223);
    EXPECT_LT(VLIBServiceStart("sftp", 0), 0);
    signalProcess(daemon, SIGKILL);
    EXPECT_TRUE(isBack("sftp", daemon));
    EXPECT_EQ(fetchSlowly(2222).exitCode, 0);
}

TEST_F(ControlledSftp, aStopEndsTheTransfer) {
    ASSERT_EQ(VLIBServiceStart("sftp", 0), 0) << lastErrorSentence();
    ProcessResult transfer;
    std::thread client([&transfer] { transfer = fetchSlowly(2222); });
    std::this_thread::sleep_for(seconds(1));
    EXPECT_EQ(VLIBServicePause("sftp"), 0) << lastErrorSentence();
    EXPECT_FALSE(serviceState("sftp").sessions.empty()) << "the transfer should still run";
    EXPECT_EQ(VLIBServiceStop("sftp", 0), 0) << lastErrorSentence();
    client.join();
    EXPECT_NE(transfer.exitCode, 0);
    EXPECT_EQ(serviceState("sftp").state, RunState::stopped);
}

TEST_F(ControlledSftp, afterABootBothServicesStart) {
    record.service_flags = VELT_FTP_SERVICE_TLS | VELT_FTP_SERVICE_PLAIN;
    ASSERT_EQ(VELTFTPConfSet(record), 0) << lastErrorSentence();
    EXPECT_EQ(messageOf(startEnabledServices()), "");
    EXPECT_TRUE(servesFtp(2121));
    EXPECT_NE(VELTSFTPIsAlive(), 0);
    const ProcessId sshd = serviceState("sftp").daemon;
    signalProcess(sshd, SIGKILL);
    EXPECT_TRUE(isBack("sftp", sshd));
}

} // namespace
} // namespace velt::test
