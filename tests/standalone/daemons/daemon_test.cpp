// The table of the daemons.
#include "standalone/daemons/daemon.h"

#include "standalone/core/state_root.h"
#include "standalone/settings/settings_store.h"
#include "tests/support/result.h"
#include "tests/support/temporary_folder.h"

#include <gtest/gtest.h>

#include <cstdio>
#include <set>

namespace velt::test {
namespace {

TEST(DaemonTable, namesEachDaemonOnce) {
    std::set<std::string_view> names;
    std::set<std::string_view> services;
    std::size_t wanted = 0;
    for (const Daemon* daemon : allDaemons()) {
        for (const std::string_view name : {daemon->name, daemon->label}) {
            names.insert(name);
            ++wanted;
        }
        for (const ServiceName& name : daemon->serviceNames) {
            EXPECT_TRUE(services.insert(name.inContract).second) << name.inContract;
            EXPECT_EQ(daemonServing(name.inContract), daemon);
        }
    }
    EXPECT_EQ(names.size(), wanted);
    EXPECT_EQ(daemonServing("ftp"), nullptr);
    EXPECT_EQ(daemonServing(""), nullptr);
    EXPECT_EQ(titleOf(ftpDaemon), "The FTP daemon");
}

class DaemonSettingsTest : public testing::Test {
protected:
    void SetUp() override { setStateRoot(root_.path()); }
    void TearDown() override { setStateRoot("/"); }

    static void storeFtp(int flags, int passiveFirst = 0, int passiveLast = 0) {
        FtpSettings settings = defaultFtpSettings();
        std::snprintf(settings.record.portnum, sizeof settings.record.portnum, "2121");
        settings.record.service_flags = flags;
        settings.record.passive_port_min = passiveFirst;
        settings.record.passive_port_max = passiveLast;
        ASSERT_EQ(messageOf(storeFtpSettings(settings)), "");
    }

    /// "2121-2121 the FTP service; ..."
    static std::string portsOf(const Daemon& daemon) {
        const auto settings = daemon.settings();
        std::string text = messageOf(settings);
        for (const DaemonPorts& ports : settings ? settings->ports : std::vector<DaemonPorts>()) {
            text += std::to_string(ports.range.first) + "-" + std::to_string(ports.range.last) + " " +
                    (ports.ofSessions ? "sessions: " : "") + ports.use + "; ";
        }
        return text;
    }

    TemporaryFolder root_;
};

TEST_F(DaemonSettingsTest, listThePortsInForce) {
    storeFtp(0);
    EXPECT_EQ(portsOf(ftpDaemon), "2121-2121 the FTP service; "
                                  "55536-55899 sessions: the passive range 55536-55899 of the FTP service; ");
    storeFtp(0, 40000);
    EXPECT_NE(portsOf(ftpDaemon).find("sessions: the passive range 55536-55899"), std::string::npos)
        << "half a range is none";
    storeFtp(0, 40000, 40100);
    EXPECT_EQ(portsOf(ftpDaemon), "2121-2121 the FTP service; "
                                  "40000-40100 sessions: the passive range 40000-40100 of the FTP service; ");
    ASSERT_EQ(messageOf(storeSftpSettings({false, 2222})), "");
    EXPECT_EQ(portsOf(sftpDaemon), "2222-2222 the SFTP service; ");
}

TEST_F(DaemonSettingsTest, tellWhichServicesAreOn) {
    for (const int flags : {0, 1, 2, 3, 4}) {
        storeFtp(flags);
        const auto settings = ftpDaemon.settings();
        ASSERT_EQ(messageOf(settings), "");
        EXPECT_EQ(settings->enabled(), flags != 0 && flags != 4);
        EXPECT_EQ(isOn(ftpDaemon, *settings, "ftpd"), (flags & VELT_FTP_SERVICE_PLAIN) != 0);
        EXPECT_EQ(isOn(ftpDaemon, *settings, "ftpd-pure"), (flags & VELT_FTP_SERVICE_PLAIN) != 0);
        EXPECT_EQ(isOn(ftpDaemon, *settings, "ftpd-ssl"), (flags & VELT_FTP_SERVICE_TLS) != 0);
        EXPECT_FALSE(isOn(ftpDaemon, *settings, "sftp"));
    }
}

TEST_F(DaemonSettingsTest, thatCannotBeReadSayWhy) {
    root_.write("etc/velt/sftp.conf", "nonsense");
    EXPECT_NE(messageOf(sftpDaemon.settings()).find("sftp.conf"), std::string::npos);
}

} // namespace
} // namespace velt::test
