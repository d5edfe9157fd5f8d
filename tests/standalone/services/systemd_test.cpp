// The backend for systemd: its units as text, and its conversation with systemctl. The program that answers
// here is a stand-in; that the real one understands the units shows only where systemd runs.

#include "standalone/core/file_store.h"
#include "standalone/core/last_error.h"
#include "standalone/services/systemd_backend.h"
#include "standalone/services/systemd_unit.h"
#include "tests/standalone/supervise/daemon_test.h"

#include <csignal>
#include <fstream>
#include <sstream>

namespace velt::test {
namespace {

TEST(SystemdUnit, OfTheFtpDaemon) {
    DaemonPlan plan;
    plan.arguments = {"/usr/sbin/proftpd", "-n", "-c", "/run/velt/proftpd.conf"};
    plan.configurationHash = "0a1b";
    plan.listenPorts = {21};
    EXPECT_EQ(renderUnit("ftpd", plan), R"([Unit]
Description=VELT FTP server
After=network.target
StartLimitIntervalSec=0

[Service]
Type=exec
ExecStart="/usr/sbin/proftpd" "-n" "-c" "/run/velt/proftpd.conf"
Restart=always
RestartSec=500ms
TimeoutStopSec=2s
KillMode=control-group

[X-Velt]
Configuration=0a1b
Port=21
)");
}

TEST(SystemdUnit, OfTheSftpDaemonLeavesSessionsToAPause) {
    EXPECT_NE(renderUnit("sftp", {}).find("\nKillMode=process\n"), std::string::npos);
}

TEST(SystemdUnit, TellsWhatItWasMadeFrom) {
    DaemonPlan plan;
    plan.configurationHash = "0a1b";
    plan.listenPorts = {21, 990};
    const DaemonPlan read = readUnit(renderUnit("ftpd", plan));
    EXPECT_EQ(read.configurationHash, "0a1b");
    EXPECT_EQ(read.listenPorts, plan.listenPorts);
}

TEST(SystemdUnit, QuotesWhatHasAMeaningOfItsOwn) {
    EXPECT_EQ(quoteUnitWord("a b"), "\"a b\"");
    EXPECT_EQ(quoteUnitWord(R"(a"b\c)"), R"("a\"b\\c")");
    EXPECT_EQ(quoteUnitWord("%h $HOME"), "\"%%h $$HOME\"");
    EXPECT_EQ(quoteUnitWord("a\nExecStart=/bin/x"), "\"a\\x0aExecStart=/bin/x\"");
    EXPECT_EQ(quoteUnitWord(""), "\"\"");
    EXPECT_EQ(quoteUnitWord("gr\xc3\xbc\xc3\x9f"), "\"gr\xc3\xbc\xc3\x9f\"");
}

/// systemctl as a script that writes down what it is asked, and starts and ends the test daemon.
class SystemdTest : public DaemonTest {
protected:
    void SetUp() override {
        DaemonTest::SetUp();
        places_.systemctl = (root_ / "systemctl").string();
        places_.journalctl = (root_ / "journalctl").string();
        places_.units = root_ / "units";
        places_.cgroups = root_ / "cgroup";
        writeScript(places_.systemctl, systemctlScript());
        writeScript(places_.journalctl, "echo first; echo last words\n");
    }

    std::string systemctlScript() const {
        std::string daemon;
        for (const std::string& argument : testPlan(port_, "").arguments) {
            daemon += argument + " ";
        }
        return "cd " + root_.string() + "\n" + R"(echo "$*" >> calls
case "$1 $3" in
"restart ")
    [ -e pid ] && kill $(cat pid)
    )" + daemon +
               R"(>/dev/null 2>&1 &
    echo $! > pid ;;
"stop ") kill $(cat pid); rm pid ;;
*ActiveState) kill -0 $(cat pid) 2>/dev/null && echo active || echo inactive ;;
*MainPID) cat pid ;;
*ControlGroup) echo /system.slice/velt-sftp.service ;;
esac
)";
    }

    static void writeScript(const std::filesystem::path& file, const std::string& text) {
        std::ofstream(file) << "#!/bin/sh\n" << text;
        std::filesystem::permissions(file, std::filesystem::perms::owner_all);
    }

    std::string calls() const {
        std::istringstream all(readFile(root_ / "calls").value_or(""));
        std::string changing;
        for (std::string line; std::getline(all, line);) {
            changing += line.starts_with("show") ? "" : line + "\n";
        }
        return changing;
    }

    int port_ = freePort();
    SystemdPlaces places_;
};

TEST_F(SystemdTest, AStartWritesTheUnitAndWaitsUntilTheDaemonListens) {
    SystemdBackend backend("sftp", places_);
    const DaemonPlan plan = testPlan(port_, "one");
    ASSERT_EQ(backend.start(plan), 0) << lastErrorSentence();
    EXPECT_TRUE(accepts(port_));
    EXPECT_EQ(readFile(places_.units / "velt-sftp.service"), renderUnit("sftp", plan));
    EXPECT_TRUE(isServing(backend.state()));
    EXPECT_EQ(backend.start(plan), 0) << "nothing changed";
    EXPECT_EQ(calls(), "daemon-reload\nrestart velt-sftp.service\n");
    EXPECT_EQ(backend.stop(), 0) << lastErrorSentence();
    EXPECT_EQ(calls(), "daemon-reload\nrestart velt-sftp.service\nstop velt-sftp.service\n");
    EXPECT_EQ(backend.state().state, RunState::stopped);
}

TEST_F(SystemdTest, AStopEndsTheSessionsInTheControlGroup) {
    SystemdBackend backend("sftp", places_);
    ASSERT_EQ(backend.start(testPlan(port_, "one")), 0) << lastErrorSentence();
    Client client(port_);
    ASSERT_TRUE(client.isServed());
    const auto sessions = descendantsOf(backend.state().daemon.pid);
    ASSERT_EQ(sessions.size(), 1U);
    const auto group = places_.cgroups / "system.slice/velt-sftp.service";
    std::filesystem::create_directories(group);
    std::ofstream(group / "cgroup.procs") << sessions[0].pid << '\n';
    ASSERT_EQ(backend.pause(), 0) << lastErrorSentence();
    // The real systemctl returns after the daemon's end, the script's kill before it.
    EXPECT_TRUE(waitUntil([this] { return !accepts(port_); }, std::chrono::seconds(2)));
    EXPECT_TRUE(client.isServed());
    std::ofstream(root_ / "pid") << sessions[0].pid << '\n'; // the script's stop wants something to end
    ASSERT_EQ(backend.stop(), 0) << lastErrorSentence();
    EXPECT_FALSE(client.isServed());
}

class FailingSystemdTest : public SystemdTest {
protected:
    void SetUp() override {
        SystemdTest::SetUp();
        writeScript(places_.systemctl, "case \"$1 $3\" in *ActiveState) echo failed ;; esac\n");
    }
};

TEST_F(FailingSystemdTest, AFailedStartGivesTheLastWordsOfTheJournal) {
    SystemdBackend backend("ftpd", places_);
    EXPECT_LT(backend.start(testPlan(port_, "one")), 0);
    EXPECT_EQ(lastErrorSentence(), "The FTP daemon does not start: last words.");
}

TEST_F(SystemdTest, ASlowRestartLeavesLessTimeForTheDaemon) {
    writeScript(places_.systemctl,
                "case \"$1 $3\" in \"restart \") sleep 3 ;; *ActiveState) echo inactive ;; esac\n");
    SystemdBackend backend("ftpd", places_);
    const auto began = std::chrono::steady_clock::now();
    EXPECT_LT(backend.start(testPlan(port_, "one")), 0);
    EXPECT_LT(std::chrono::steady_clock::now() - began, std::chrono::milliseconds(6500));
}

TEST_F(SystemdTest, WhatWasNeverStartedIsStoppedWithoutACall) {
    SystemdBackend backend("ftpd", places_);
    EXPECT_EQ(backend.stop(), 0) << lastErrorSentence();
    EXPECT_EQ(backend.pause(), 0) << lastErrorSentence();
    EXPECT_EQ(calls(), "");
}

} // namespace
} // namespace velt::test
