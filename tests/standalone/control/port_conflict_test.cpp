// The port test: what the FTP and SFTP settings may not take.

#include "base/file.h"
#include "ftp/ftp_library.h"
#include "platform/service.h"
#include "platform/sftp.h"
#include "platform/webapi.h"
#include "standalone/contract/last_error.h"
#include "standalone/core/state_root.h"
#include "standalone/standalone.h"
#include "tests/standalone/control/plan_double.h"
#include "tests/standalone/supervise/daemon_test.h"
#include "tests/standalone/support/daemon_states.h"
#include "tests/support/ports.h"
#include "tests/support/waiting.h"

#include <unistd.h>

#include <cerrno>
#include <climits>
#include <cstdio>
#include <thread>

namespace velt::test {
namespace {

using WebUtils::IsPortConflict;

class PortConflictTest : public DaemonTest {
protected:
    void SetUp() override {
        DaemonTest::SetUp();
        planDouble() = {};
        storeFtp(0, 0);
        ASSERT_EQ(VELTSFTPConfigSet(0, sftpPort_), 0) << lastErrorSentence();
        clearLastError();
    }

    void TearDown() override {
        EXPECT_EQ(VLIBServiceStop("ftpd", 0), 0) << lastErrorSentence();
        EXPECT_EQ(VLIBServiceStop("sftp", 0), 0) << lastErrorSentence();
        DaemonTest::TearDown();
    }

    void storeFtp(int passiveFirst, int passiveLast, int flags = 0) const {
        _tag_VELT_FTP_CONF_ record{};
        ASSERT_EQ(VELTFTPConfGet(&record), 0) << lastErrorSentence();
        std::snprintf(record.portnum, sizeof record.portnum, "%d", ftpPort_);
        record.passive_port_min = passiveFirst;
        record.passive_port_max = passiveLast;
        record.service_flags = flags;
        ASSERT_EQ(VELTFTPConfSet(record), 0) << lastErrorSentence();
    }

    static void expectNoConflict(const char* service, int first, int last) {
        EXPECT_EQ(IsPortConflict(service, first, last), 0) << lastErrorSentence();
        EXPECT_EQ(lastPortConflict().holder, "");
        EXPECT_EQ(lastPortConflict().port, 0);
    }

    static void expectConflict(const char* service, int first, int last, int port,
                               const std::string& holder) {
        EXPECT_NE(IsPortConflict(service, first, last), 0) << service << " " << first << ":" << last;
        EXPECT_EQ(lastPortConflict().port, port);
        EXPECT_EQ(lastPortConflict().holder, holder);
        const bool isReserved = holder.ends_with(" of this server");
        EXPECT_EQ(lastErrorSentence(), "Port " + std::to_string(port) +
                                           (isReserved ? " is reserved for " : " is taken by ") + holder +
                                           ".");
    }

    static std::string thisProcess() {
        return std::string(program_invocation_short_name).substr(0, 15) + " (process " +
               std::to_string(::getpid()) + ")";
    }

    int ftpPort_ = freePort();
    int sftpPort_ = freePort();
};

TEST_F(PortConflictTest, PortsOutsideTheirRangeConflict) {
    for (const char* service : {"ftp", "ssh"}) {
        for (const int port : {0, -1, 65536, INT_MAX, INT_MIN}) {
            EXPECT_NE(IsPortConflict(service, port, port), 0) << port;
            EXPECT_EQ(lastPortConflict().holder, "");
            EXPECT_EQ(lastErrorSentence(),
                      "Port " + std::to_string(port) + ": expected a port from 1 to 65535.");
        }
        EXPECT_NE(IsPortConflict(service, 40000, 65536), 0);
        EXPECT_NE(IsPortConflict(service, 0, 40000), 0);
    }
    expectNoConflict("ssh", 65535, 65535);
}

TEST_F(PortConflictTest, ARangeUpsideDownConflicts) {
    EXPECT_NE(IsPortConflict("ftp", 40010, 40000), 0);
    EXPECT_EQ(lastErrorSentence(),
              "The port range is 40010-40000; its first port has to be lower than its last.");
}

TEST_F(PortConflictTest, FreePortsAreNoConflict) {
    const int port = freePort();
    expectNoConflict("ftp", port, port);
    expectNoConflict("ssh", port, port);
    expectNoConflict("ftp", 45000, 45010);
}

TEST_F(PortConflictTest, TheOtherServicesPortsConflict) {
    expectConflict("ftp", sftpPort_, sftpPort_, sftpPort_, "the SFTP service");
    expectConflict("ftp", sftpPort_ - 5, sftpPort_ + 5, sftpPort_, "the SFTP service");
    expectConflict("ssh", ftpPort_, ftpPort_, ftpPort_, "the FTP service");
    expectConflict("ssh", 55536, 55536, 55536, "the passive range 55536-55899 of the FTP service");
    storeFtp(45000, 45010);
    expectConflict("ssh", 45010, 45010, 45010, "the passive range 45000-45010 of the FTP service");
    expectNoConflict("ssh", 55536, 55536);
}

TEST_F(PortConflictTest, APassiveRangeMayNotHoldTheControlPort) {
    expectConflict("ftp", ftpPort_ - 1, ftpPort_ + 1, ftpPort_, "the FTP service");
}

TEST_F(PortConflictTest, AServicesOwnPortsAreNoConflict) {
    storeFtp(45000, 45010);
    expectNoConflict("ftp", ftpPort_, ftpPort_);
    expectNoConflict("ssh", sftpPort_, sftpPort_);
    expectNoConflict("ftp", 45000, 45010);
    expectNoConflict("ftp", 45005, 45020);
}

TEST_F(PortConflictTest, AnyOtherServiceMustAvoidBoth) {
    expectConflict("web", ftpPort_, ftpPort_, ftpPort_, "the FTP service");
    expectConflict("web", sftpPort_, sftpPort_, sftpPort_, "the SFTP service");
    EXPECT_NE(IsPortConflict(nullptr, sftpPort_, sftpPort_), 0);
}

TEST_F(PortConflictTest, KnownServicesKeepTheirPorts) {
    expectConflict("ftp", 443, 443, 443, "the service https of this server");
    expectConflict("ssh", 445, 445, 445, "the service smb of this server");
    expectConflict("ftp", 22, 22, 22, "the service ssh of this server");
    expectConflict("ftp", 3300, 3310, 3306, "the service mysql of this server");
}

TEST_F(PortConflictTest, TheListOfKnownServicesIsTheAdministrators) {
    const auto file = statePath("/etc/velt/known_services.conf");
    ASSERT_TRUE(replaceFile(file, "# ours\n\n45000-45002 backup # nightly\n  45010\tssh\n", 0644));
    expectConflict("ftp", 45002, 45002, 45002, "the service backup of this server");
    expectConflict("ftp", 45010, 45010, 45010, "the service ssh of this server");
    expectNoConflict("ssh", 45010, 45010);
    for (const char* line : {"45000", "x backup", "0 backup", "45000-44000 backup", "65536 backup",
                             "1 two words", "45000- backup", "-5 backup"}) {
        ASSERT_TRUE(replaceFile(file, std::string("45010 good\n") + line + "\n", 0644));
        EXPECT_NE(IsPortConflict("ftp", 46000, 46000), 0) << line;
        EXPECT_NE(lastErrorSentence().find("known_services.conf, line 2: "), std::string::npos)
            << lastErrorSentence();
    }
}

TEST_F(PortConflictTest, DamagedSettingsAreNoPermission) {
    ASSERT_TRUE(replaceFile(statePath("/etc/velt/sftp.conf"), "nonsense\n", 0644));
    EXPECT_NE(IsPortConflict("ftp", 46000, 46000), 0);
    EXPECT_NE(lastErrorSentence().find("sftp.conf"), std::string::npos) << lastErrorSentence();
}

TEST_F(PortConflictTest, WhoeverListensIsNamed) {
    const int port = freePort();
    const Listener other(port);
    expectConflict("ftp", port, port, port, thisProcess());
    expectConflict("ssh", port, port, port, thisProcess());
    expectConflict("ftp", port - 1, port + 1, port, thisProcess());
}

TEST_F(PortConflictTest, AStrangerOnTheStoredPortConflicts) {
    const Listener onFtp(ftpPort_);
    const Listener onSftp(sftpPort_);
    expectConflict("ftp", ftpPort_, ftpPort_, ftpPort_, thisProcess());
    expectConflict("ssh", sftpPort_, sftpPort_, sftpPort_, thisProcess());
    const Listener onPassive(45003);
    storeFtp(45000, 45010);
    expectNoConflict("ftp", 45000, 45010);
}

TEST_F(PortConflictTest, TheDaemonAndItsSessionsAreNotInTheirOwnWay) {
    storeFtp(0, 0, VELT_FTP_SERVICE_PLAIN);
    const int second = freePort();
    planDouble().ftpOptions = {"--port", std::to_string(second)};
    ASSERT_EQ(VLIBServicectlStart("ftpd", 0), 0) << lastErrorSentence();
    ASSERT_TRUE(waitUntil([&] { return accepts(second); }, patience));
    expectNoConflict("ftp", second, second);
    expectNoConflict("ftp", ftpPort_, ftpPort_);
    expectConflict("ssh", second, second, second,
                   "velt-test-daemo (process " + std::to_string(serviceState("ftpd").daemon.pid) + ")");
}

TEST_F(PortConflictTest, EachThreadRemembersItsOwnAnswer) {
    EXPECT_NE(IsPortConflict("ftp", sftpPort_, sftpPort_), 0);
    std::thread([] {
        EXPECT_EQ(lastPortConflict().holder, "");
        expectConflict("ftp", 443, 443, 443, "the service https of this server");
    }).join();
    EXPECT_EQ(lastPortConflict().holder, "the SFTP service");
    expectNoConflict("ftp", 46000, 46000);
}

} // namespace
} // namespace velt::test
