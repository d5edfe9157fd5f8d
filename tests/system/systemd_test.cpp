// The services as units of a real systemd, with the real daemons and clients.
#include "ftp/ftp_library.h"
#include "platform/service.h"
#include "platform/sftp.h"
#include "standalone/contract/last_error.h"
#include "standalone/control/supervised_daemon.h"
#include "standalone/control/systemd_launcher.h"
#include "standalone/standalone.h"
#include "tests/standalone/support/store_shares.h"
#include "tests/support/files.h"
#include "tests/support/result.h"
#include "tests/support/waiting.h"
#include "tests/system/support/systemd_services.h"

#include <csignal>
#include <filesystem>
#include <fstream>
#include <string>
#include <thread>
#include <vector>

namespace velt::test {
namespace {
namespace fs = std::filesystem;
using std::chrono::milliseconds;
using std::chrono::seconds;

constexpr int plain = VELT_FTP_SERVICE_PLAIN;
constexpr int tls = VELT_FTP_SERVICE_TLS;

TEST_F(UnderSystemd, theFtpDaemonFollowsTheStoredSettings) {
    inside([] {
        openMachine();
        storeFtp(plain);
        ASSERT_EQ(VLIBServiceStart("ftpd", 0), 0) << lastErrorSentence();
        EXPECT_EQ(fetchByFtp(), "alice");
        EXPECT_EQ(unitState("velt-ftpd.service"), "active");
        EXPECT_EQ(contentsOf("/etc/velt/run-keys/ftpd"), "1\n");
        const DaemonState first = serviceState("ftpd");
        EXPECT_EQ(unitProperty("velt-ftpd.service", "MainPID"), std::to_string(first.supervisor.pid));
        for (const char* name : {"ftpd", "ftpd-pure", "ftpd-ssl"}) {
            EXPECT_EQ(VLIBServicectlStart(name, 0), 0) << lastErrorSentence();
        }
        EXPECT_EQ(serviceState("ftpd").daemon, first.daemon) << "nothing changed";

        storeFtp(plain | tls, 2121);
        ASSERT_EQ(VLIBServicectlStart("ftpd-ssl", 0), 0) << lastErrorSentence();
        EXPECT_EQ(fetchByFtp("/home-of", 2121), "alice");
        EXPECT_EQ(fetchByFtp("/home-of", 21), "");
        EXPECT_EQ(serviceState("ftpd").supervisor, first.supervisor);

        for (const char* name : {"ftpd-pure", "ftpd-ssl", "ftpd"}) {
            ASSERT_EQ(VLIBServicectlStart("ftpd", 0), 0) << lastErrorSentence();
            EXPECT_EQ(VLIBServicectlStop(name, 0), 0) << lastErrorSentence();
            EXPECT_EQ(fetchByFtp("/home-of", 2121), "");
            EXPECT_EQ(unitState("velt-ftpd.service"), "inactive");
            EXPECT_EQ(VLIBServicectlStop(name, 0), 0) << "a second stop is no failure";
        }
        ASSERT_EQ(VLIBServicectlStart("ftpd", 0), 0) << lastErrorSentence();
        storeFtp(0, 2121);
        EXPECT_EQ(VLIBServicectlStart("ftpd", 0), 0) << lastErrorSentence();
        EXPECT_EQ(unitState("velt-ftpd.service"), "inactive");
    });
}

TEST_F(UnderSystemd, manyChangesInARowAreNoCrashes) {
    inside([] {
        openMachine();
        for (int port = 2121; port < 2129; ++port) {
            storeFtp(plain, port);
            ASSERT_EQ(VLIBServicectlStop("ftpd", 0), 0) << lastErrorSentence();
            ASSERT_EQ(VLIBServicectlStart("ftpd", 0), 0) << lastErrorSentence();
        }
        EXPECT_EQ(fetchByFtp("/home-of", 2128), "alice");
    });
}

TEST_F(UnderSystemd, aChangeHandsThePortOverAndKeepsTheSessions) {
    inside([] {
        openMachine();
        storeFtp(plain, 2121);
        ASSERT_EQ(VLIBServiceStart("ftpd", 0), 0) << lastErrorSentence();
        std::ofstream("/home/alice/large") << std::string(std::size_t{20} * 1000 * 1000, 'x');
        std::string size;
        std::thread client([&size] {
            size = runProcess({"curl", "-sS", "--limit-rate", "5M", "-o", "/dev/null", "-w",
                               "%{size_download}", "-u", "alice:alice-secret", "ftp://127.0.0.1:2121/large"},
                              {}, std::chrono::seconds(20))
                       .output;
        });
        const ProcessId former = serviceState("ftpd").daemon;
        EXPECT_TRUE(waitUntil([&] { return !childrenOf(former.pid).empty(); }, patience));
        std::this_thread::sleep_for(milliseconds(500));
        ServiceRequest request(SessionPolicy::keep);
        storeFtp(plain, 2121, false);
        ASSERT_EQ(VLIBServicectlStop("ftpd", 0), 0) << lastErrorSentence();
        ASSERT_EQ(VLIBServicectlStart("ftpd", 0), 0) << lastErrorSentence();
        EXPECT_EQ(request.finish().valueOr({}), (std::vector<ServiceSessions>{{"ftp", 0, 1}}));
        EXPECT_NE(serviceState("ftpd").daemon, former);
        EXPECT_TRUE(isAlive(former)) << "it was not let look at its sockets, and ended at once";
        client.join();
        EXPECT_EQ(size, "20000000");
        EXPECT_TRUE(waitUntil([&] { return !isAlive(former); }, patience));
        // A supervisor that is killed is started again for the settings of now.
        const std::string hash = serviceState("ftpd").configurationHash;
        const ProcessId successor = serviceState("ftpd").daemon;
        signalProcess(serviceState("ftpd").supervisor, SIGKILL);
        ASSERT_TRUE(isBack("ftpd", successor));
        EXPECT_EQ(serviceState("ftpd").configurationHash, hash);
    });
}

TEST_F(UnderSystemd, aStartThatFailsSaysWhyWithinFiveSeconds) {
    inside([] {
        openMachine();
        SupervisedDaemon ftp(ftpDaemon, std::make_unique<SystemdLauncher>(ftpDaemon));
        std::ofstream("/run/wrong.conf") << "Prot 21\n";
        DaemonOrder order{"wrong", {21}, {"/usr/sbin/proftpd", "-n", "-c", "/run/wrong.conf"}};
        EXPECT_EQ(messageOf(ftp.start(order)),
                  "The FTP daemon does not start: unknown configuration directive "
                  "'Prot' on line 1 of '/run/wrong.conf'.");
        EXPECT_NE(unitState("velt-ftpd.service"), "active");

        const auto began = std::chrono::steady_clock::now();
        order.arguments = {"/bin/sleep", "60"};
        const std::string refusal = messageOf(ftp.start(order));
        EXPECT_LT(std::chrono::steady_clock::now() - began, milliseconds(5200));
        EXPECT_NE(refusal.find("in time"), std::string::npos) << refusal;
        EXPECT_NE(runProcess({"pidof", "sleep"}).exitCode, 0) << "it still runs";

        EXPECT_EQ(unitState("velt-ftpd.service"), "failed");
        EXPECT_EQ(messageOf(ftp.stop()), "");
        EXPECT_EQ(unitState("velt-ftpd.service"), "inactive") << "what is switched off is no failure";
        storeFtp(plain);
        EXPECT_EQ(VLIBServiceStart("ftpd", 0), 0) << "a failure is over: " << lastErrorSentence();
        EXPECT_EQ(fetchByFtp(), "alice");
    });
}

TEST_F(UnderSystemd, whatWasKilledIsBackWithinTwoSeconds) {
    inside([] {
        openMachine();
        storeFtp(plain);
        storeSftp(true);
        ASSERT_EQ(messageOf(startEnabledServices()), "");
        for (const char* service : {"ftpd", "sftp"}) {
            const DaemonState before = serviceState(service);
            signalProcess(before.daemon, SIGKILL);
            EXPECT_TRUE(isBack(service, before.daemon)) << service;
            EXPECT_EQ(serviceState(service).supervisor, before.supervisor);
        }
        for (const char* service : {"ftpd", "sftp"}) {
            const DaemonState before = serviceState(service);
            signalProcess(before.supervisor, SIGKILL);
            EXPECT_TRUE(isBack(service, before.daemon)) << service << " after its supervisor was killed";
            EXPECT_NE(serviceState(service).supervisor, before.supervisor);
        }
        EXPECT_EQ(fetchByFtp(), "alice");
        EXPECT_NE(VELTSFTPIsAlive(), 0);
    });
}

TEST_F(UnderSystemd, aKilledSupervisorComesBackForTheLastSettingsAndNotAfterAStop) {
    inside([] {
        openMachine();
        storeSftp(true);
        ASSERT_EQ(VLIBServiceStart("sftp", 0), 0) << lastErrorSentence();
        ASSERT_EQ(VLIBServicePause("sftp"), 0) << lastErrorSentence();
        storeSftp(true, 2223);
        ASSERT_EQ(VLIBServiceResume("sftp"), 0) << lastErrorSentence();
        const DaemonState moved = serviceState("sftp");
        signalProcess(moved.supervisor, SIGKILL);
        ASSERT_TRUE(isBack("sftp", moved.daemon));
        EXPECT_EQ(serviceState("sftp").ports, std::vector{2223});

        signalProcess(serviceState("sftp").supervisor, SIGKILL);
        EXPECT_EQ(VLIBServiceStop("sftp", 0), 0) << lastErrorSentence();
        EXPECT_FALSE(waitUntil([] { return isServing(serviceState("sftp")); }, seconds(1)));
        EXPECT_EQ(unitState("velt-sftp.service"), "inactive");
    });
}

TEST_F(UnderSystemd, anAdministratorMayUseSystemctl) {
    inside([] {
        openMachine();
        storeFtp(plain, 2121);
        ASSERT_EQ(VLIBServiceStart("ftpd", 0), 0) << lastErrorSentence();
        const ProcessResult verdict =
            runProcess({"systemd-analyze", "verify", "/run/systemd/system/velt-ftpd.service"});
        EXPECT_EQ(verdict.errors.find("velt"), std::string::npos) << verdict.errors;
        EXPECT_EQ(verdict.exitCode, 0) << verdict.errors;
        storeFtp(plain, 2122); // taken up by the running supervisor
        ASSERT_EQ(VLIBServicectlStart("ftpd", 0), 0) << lastErrorSentence();
        const ProcessId daemon = serviceState("ftpd").daemon;
        EXPECT_EQ(runProcess({"systemctl", "restart", "velt-ftpd"}).exitCode, 0);
        EXPECT_NE(serviceState("ftpd").daemon, daemon);
        EXPECT_EQ(fetchByFtp("/home-of", 2122), "alice");
        EXPECT_EQ(runProcess({"systemctl", "stop", "velt-ftpd"}).exitCode, 0);
        EXPECT_EQ(serviceState("ftpd").state, RunState::stopped);
        EXPECT_EQ(fetchByFtp("/home-of", 2122), "");
        EXPECT_EQ(VLIBServicectlStart("ftpd", 0), 0) << lastErrorSentence();
        EXPECT_EQ(fetchByFtp("/home-of", 2122), "alice");

        EXPECT_EQ(VLIBServicectlStop("ftpd", 0), 0) << lastErrorSentence();
        EXPECT_EQ(runProcess({"systemctl", "mask", "velt-ftpd"}).exitCode, 0);
        EXPECT_LT(VLIBServicectlStart("ftpd", 0), 0);
        EXPECT_NE(lastErrorSentence().find("masked"), std::string::npos) << lastErrorSentence();
    });
}

TEST_F(UnderSystemd, theShareRootIsTheDaemonsOwn) {
    inside([] {
        openMachine();
        fs::create_directories("/srv/music");
        std::ofstream("/srv/music/about") << "music";
        ASSERT_EQ(messageOf(storeShares({{"music", "", "/srv/music", true, {{"alice", Access::read}}, {}}})),
                  "");
        const std::string mounts = contentsOf("/proc/1/mounts");
        storeFtp(plain, 21, false);
        ASSERT_EQ(VLIBServiceStart("ftpd", 0), 0) << lastErrorSentence();
        EXPECT_EQ(fetchByFtp("/music/about"), "music");
        EXPECT_EQ(fetchByFtp("//etc/passwd"), "");
        EXPECT_EQ(contentsOf("/proc/1/mounts"), mounts);
        ASSERT_EQ(VLIBServiceStop("ftpd", 0), 0) << lastErrorSentence();
        EXPECT_EQ(contentsOf("/proc/1/mounts"), mounts);
    });
}

} // namespace
} // namespace velt::test
