// The units for systemd as text, and the conversation with systemctl. The program that answers here is a
// stand-in, which starts and ends real supervisors.

#include "base/file.h"
#include "standalone/contract/last_error.h"
#include "standalone/control/supervised_daemon.h"
#include "standalone/control/systemd_launcher.h"
#include "standalone/control/systemd_unit.h"
#include "standalone/core/installed_files.h"
#include "standalone/core/state_root.h"
#include "tests/standalone/supervise/daemon_test.h"
#include "tests/support/ports.h"
#include "tests/support/result.h"
#include "tests/support/run_program.h"
#include "tests/support/waiting.h"

#include <csignal>
#include <fstream>
#include <memory>
#include <sstream>

namespace velt::test {
namespace {

using std::chrono::milliseconds;
using std::chrono::seconds;

class SystemdTest : public DaemonTest {
protected:
    void SetUp() override {
        DaemonTest::SetUp();
        places_.systemctl = (root_ / "systemctl").string();
        places_.units = root_ / "units";
        answerWith(systemctlScript());
        sftp_ = std::make_unique<SupervisedDaemon>(sftpDaemon,
                                                   std::make_unique<SystemdLauncher>(sftpDaemon, places_));
    }

    void TearDown() override {
        EXPECT_EQ(messageOf(sftp_->stop()), "");
        DaemonTest::TearDown();
    }

    /// Writes down what it is asked. A restart runs the supervisor, and ends when the state file tells that
    /// the daemon serves or does not; a supervisor that fails leaves its reason there.
    std::string systemctlScript() const {
        return "cd " + root_.string() + "\necho \"$*\" >> calls\nstate=run/velt/sftp.state\n" +
               R"(end() { [ -e pid ] && kill $(cat pid) 2>/dev/null; }
case "$1" in
restart)
    end
    )" + installedFile("velt-supervise").string() +
               " " + (root_ / "run/velt").string() + R"( sftp >/dev/null 2>&1 &
    echo $! > pid
    while kill -0 $! 2>/dev/null; do
        grep -q "^supervisor $! " $state && grep -q "^state running" $state && exit 0
        sleep 0.01
    done
    exit 1 ;;
stop) end; exit 0 ;;
show) sed -n 's/^reason //p' $state ;;
esac
)";
    }

    void answerWith(const std::string& script) const {
        std::ofstream(places_.systemctl) << "#!/bin/sh\n" << script;
        std::filesystem::permissions(places_.systemctl, std::filesystem::perms::owner_all);
    }

    std::string calls() const { return readFile(root_ / "calls").valueOr(""); }
    void forgetCalls() const { std::filesystem::remove(root_ / "calls"); }

    void start(const std::string& hash) { ASSERT_EQ(messageOf(sftp_->start(testOrder(port_, hash))), ""); }

    void killSupervisor() {
        const ProcessId supervisor = daemonState(sftpDaemon).supervisor;
        signalProcess(supervisor, SIGKILL);
        ASSERT_TRUE(waitUntil([&] { return !isAlive(supervisor); }, patience));
    }

    int port_ = freePort();
    SystemdPlaces places_;
    std::unique_ptr<SupervisedDaemon> sftp_;
};

TEST_F(SystemdTest, TheUnitRunsTheSupervisor) {
    EXPECT_EQ(renderUnit(sftpDaemon, "/run/velt"), R"([Unit]
Description=VELT SFTP server
After=network.target
StartLimitIntervalSec=0

[Service]
Type=notify
ExecStart=")" + installedFile("velt-supervise").string() +
                                                       R"(" "/run/velt" "sftp"
Restart=on-abnormal
RestartSec=100ms
KillMode=process
TimeoutStartSec=10s
TimeoutStopSec=5s
OOMPolicy=continue
CapabilityBoundingSet=CAP_AUDIT_WRITE CAP_CHOWN CAP_DAC_OVERRIDE CAP_DAC_READ_SEARCH CAP_FOWNER CAP_FSETID CAP_KILL CAP_NET_ADMIN CAP_NET_BIND_SERVICE CAP_SETGID CAP_SETUID CAP_SYS_ADMIN CAP_SYS_CHROOT CAP_SYS_NICE CAP_SYS_PTRACE CAP_SYS_RESOURCE
NoNewPrivileges=yes
SystemCallFilter=~@clock @cpu-emulation @debug @module @obsolete @raw-io @reboot @swap
SystemCallFilter=pidfd_getfd
SystemCallErrorNumber=EPERM
SystemCallArchitectures=native
PrivateDevices=yes
ProtectClock=yes
ProtectControlGroups=yes
ProtectHostname=yes
ProtectKernelLogs=yes
ProtectKernelModules=yes
ProtectKernelTunables=yes
RestrictAddressFamilies=AF_UNIX AF_INET AF_INET6 AF_NETLINK
RestrictNamespaces=mnt
RestrictRealtime=yes
LockPersonality=yes
)");
    EXPECT_EQ(unitName(ftpDaemon), "velt-ftpd.service");
}

TEST(SystemdUnit, QuotesWhatHasAMeaningOfItsOwn) {
    EXPECT_EQ(quoteUnitWord("a b"), "\"a b\"");
    EXPECT_EQ(quoteUnitWord(R"(a"b\c)"), R"("a\"b\\c")");
    EXPECT_EQ(quoteUnitWord("%h $HOME"), "\"%%h $$HOME\"");
    EXPECT_EQ(quoteUnitWord("a\nExecStart=/bin/x"), "\"a\\x0aExecStart=/bin/x\"");
    EXPECT_EQ(quoteUnitWord(""), "\"\"");
    EXPECT_EQ(quoteUnitWord("gr\xc3\xbc\xc3\x9f"), "\"gr\xc3\xbc\xc3\x9f\"");
}

TEST_F(SystemdTest, AStartWritesTheUnitAndReturnsWhenTheDaemonListens) {
    start("one");
    EXPECT_TRUE(accepts(port_));
    EXPECT_EQ(readFile(places_.units / "velt-sftp.service"), renderUnit(sftpDaemon, statePath("/run/velt")));
    EXPECT_TRUE(isServing(daemonState(sftpDaemon)));
    EXPECT_EQ(calls(), "daemon-reload\nrestart velt-sftp.service\n");
    forgetCalls();
    start("one");
    EXPECT_EQ(calls(), "") << "nothing changed";
    EXPECT_EQ(messageOf(sftp_->stop()), "");
    EXPECT_EQ(calls(), "stop velt-sftp.service\nreset-failed velt-sftp.service\n");
    EXPECT_EQ(daemonState(sftpDaemon).state, RunState::stopped);
    forgetCalls();
    start("two");
    EXPECT_EQ(calls(), "restart velt-sftp.service\n") << "the unit is as it was";
}

TEST_F(SystemdTest, TheStockServersStopLeavesTheFolderThatEachConnectionNeeds) {
    start("one");
    EXPECT_EQ(readFile(places_.units / "ssh.service.d/velt-sftp.conf"),
              "[Service]\nRuntimeDirectoryPreserve=yes\n");
    SupervisedDaemon ftp(ftpDaemon, std::make_unique<SystemdLauncher>(ftpDaemon, places_));
    std::filesystem::remove_all(places_.units / "ssh.service.d");
    EXPECT_FALSE(ftp.start(testOrder(freePort(), "one", {"--refuse", "no"})));
    EXPECT_FALSE(std::filesystem::exists(places_.units / "ssh.service.d")) << "FTP does not need it";
}

TEST_F(SystemdTest, WhatIsClosedIsNotStartedAgain) {
    start("one");
    Client client(port_);
    ASSERT_TRUE(client.isServed());
    forgetCalls();
    ASSERT_EQ(messageOf(sftp_->close()), "");
    EXPECT_FALSE(accepts(port_));
    EXPECT_TRUE(client.isServed());
    EXPECT_EQ(calls(), "") << "the unit goes on until the last session has ended";
    EXPECT_FALSE(std::filesystem::exists(orderFile(statePath("/run/velt"), "sftp")))
        << "without it a supervisor that systemd starts ends at once";
    start("two");
    EXPECT_TRUE(std::filesystem::exists(orderFile(statePath("/run/velt"), "sftp")));
    EXPECT_TRUE(client.isServed());
}

TEST_F(SystemdTest, SessionsThatWereMovedOutOfTheUnitOutliveAPauseAndEndWithAStop) {
    start("one");
    Client client(port_); // no control group tells whose session this is
    ASSERT_TRUE(client.isServed());
    ASSERT_EQ(messageOf(sftp_->pause()), "");
    EXPECT_FALSE(accepts(port_));
    EXPECT_TRUE(client.isServed());
    ASSERT_EQ(messageOf(sftp_->stop()), "");
    EXPECT_FALSE(client.isServed());
}

TEST_F(SystemdTest, AKilledSupervisorComesBackWithTheSettingsThatWereTakenUpLast) {
    start("one");
    const int former = port_;
    port_ = freePort();
    start("two");
    killSupervisor();
    ASSERT_EQ(runProcess({places_.systemctl, "restart", "velt-sftp.service"}).exitCode, 0);
    EXPECT_TRUE(accepts(port_));
    EXPECT_FALSE(accepts(former));
    EXPECT_EQ(daemonState(sftpDaemon).configurationHash, "two");
}

TEST_F(SystemdTest, AStopOfAKilledSupervisorIsToldToSystemd) {
    start("one");
    killSupervisor();
    forgetCalls();
    EXPECT_EQ(messageOf(sftp_->stop()), "");
    EXPECT_TRUE(calls().starts_with("stop velt-sftp.service\n")) << "or the daemon would come back";
    EXPECT_FALSE(accepts(port_));
}

TEST_F(SystemdTest, AStopIsNotDoneWhileTheUnitCannotBeLookedAt) {
    start("one");
    const auto aside = root_ / "units-aside";
    std::filesystem::rename(places_.units, aside);
    std::filesystem::create_symlink("units", places_.units); // leads nowhere but to itself
    const auto unit = (places_.units / "velt-sftp.service").string();
    EXPECT_EQ(messageOf(sftp_->stop()), "The SFTP daemon cannot be stopped: Cannot look at " + unit +
                                            ": Too many levels of symbolic links.");
    std::filesystem::remove(places_.units);
    std::filesystem::rename(aside, places_.units);
    forgetCalls();
    EXPECT_EQ(messageOf(sftp_->stop()), "");
    EXPECT_TRUE(calls().starts_with("stop velt-sftp.service\n")) << "or the daemon would come back";
}

TEST_F(SystemdTest, AFailedStartGivesTheDaemonsWords) {
    const std::string refusal =
        messageOf(sftp_->start(testOrder(port_, "one", {"--refuse", "fatal: no such certificate"})));
    EXPECT_EQ(refusal, "The SFTP daemon does not start: fatal: no such certificate.");
}

TEST_F(SystemdTest, SystemdsOwnRefusalIsNamed) {
    answerWith("[ $1 = restart ] || exit 0\necho 'Failed to restart: Unit is masked.' >&2; exit 1\n");
    std::string refusal = messageOf(sftp_->start(testOrder(port_, "one")));
    EXPECT_EQ(refusal, "The SFTP daemon does not start: Failed to restart: Unit is masked.");
    answerWith("[ $1 = daemon-reload ] && exit 3\nexit 0\n");
    std::filesystem::remove(places_.units / "velt-sftp.service");
    refusal = messageOf(sftp_->start(testOrder(port_, "one")));
    EXPECT_EQ(refusal, "The SFTP daemon does not start: systemctl ended with status 3.");
}

TEST_F(SystemdTest, ASystemctlThatCannotBeRunIsNamed) {
    start("one");
    ASSERT_EQ(messageOf(sftp_->stop()), "");
    std::filesystem::remove(places_.systemctl);
    const std::string refusal = messageOf(sftp_->start(testOrder(port_, "one")));
    EXPECT_EQ(refusal, "The SFTP daemon does not start: Cannot start " + places_.systemctl +
                           ": No such file or directory.");
    answerWith(systemctlScript());
}

TEST_F(SystemdTest, AnAnswerIsNotTakenForADaemon) {
    answerWith("exit 0\n"); // as in a changed root, where systemctl ignores all requests
    const std::string refusal = messageOf(sftp_->start(testOrder(port_, "one")));
    EXPECT_EQ(refusal,
              "The SFTP daemon does not start: systemd reports a start, but the daemon does not serve.");
}

TEST_F(SystemdTest, AStartIsOverWithinFiveSeconds) {
    const milliseconds usual =
        timeOf([this] { ASSERT_EQ(messageOf(sftp_->start(testOrder(port_, "one"))), ""); });
    ASSERT_EQ(messageOf(sftp_->stop()), "");
    answerWith("[ $1 = restart ] && exec sleep 60\nexit 0\n");
    const auto began = std::chrono::steady_clock::now();
    const std::string refusal = messageOf(sftp_->start(testOrder(port_, "one")));
    EXPECT_LT(std::chrono::steady_clock::now() - began, milliseconds(5500) + 3 * usual);
    EXPECT_EQ(refusal, "The SFTP daemon does not start: its supervisor did not report in time.");
}

TEST_F(SystemdTest, WhatWasNeverStartedIsStoppedWithoutACall) {
    EXPECT_EQ(messageOf(sftp_->stop()), "");
    EXPECT_EQ(messageOf(sftp_->pause()), "");
    EXPECT_EQ(calls(), "");
}

} // namespace
} // namespace velt::test
