// Which ports are open.
#include "standalone/control/service_firewall.h"
#include "standalone/settings/settings_store.h"
#include "tests/standalone/support/state_folder.h"
#include "tests/support/result.h"

#include <gtest/gtest.h>

#include <cstdio>

namespace velt::test {
namespace {

class EnabledPorts : public testing::Test {
protected:
    static void storeFtp(int flags, int passiveFirst = 0, int passiveLast = 0) {
        FtpSettings settings = defaultFtpSettings();
        std::snprintf(settings.record.portnum, sizeof settings.record.portnum, "2121");
        settings.record.service_flags = flags;
        settings.record.passive_port_min = passiveFirst;
        settings.record.passive_port_max = passiveLast;
        ASSERT_EQ(messageOf(storeFtpSettings(settings)), "");
    }

    static void storeSftp(bool enabled) { ASSERT_EQ(messageOf(storeSftpSettings({enabled, 2222})), ""); }

    /// "2121-2121 55536-55899 "
    static std::string open() { return describe(&FirewallNeeds::openPorts); }
    static std::string login() { return describe(&FirewallNeeds::loginPorts); }

    static std::string describe(std::vector<VELT_FTP_PORT_RANGE> FirewallNeeds::*which) {
        const auto needs = firewallNeeds();
        if (!needs) {
            return needs.error().message;
        }
        std::string text;
        for (const VELT_FTP_PORT_RANGE& range : (*needs).*which) {
            text += std::to_string(range.first) + "-" + std::to_string(range.last) + " ";
        }
        return text;
    }

    StateFolder root_;
};

TEST_F(EnabledPorts, AreThoseOfTheEnabledServices) {
    storeFtp(0);
    storeSftp(false);
    EXPECT_EQ(open(), "");
    storeFtp(VELT_FTP_SERVICE_TLS);
    EXPECT_EQ(open(), "2121-2121 55536-55899 ");
    storeFtp(VELT_FTP_SERVICE_TLS, 40000);
    EXPECT_EQ(open(), "2121-2121 55536-55899 ") << "half a range is none";
    storeFtp(VELT_FTP_SERVICE_PLAIN, 40000, 40100);
    storeSftp(true);
    EXPECT_EQ(open(), "2121-2121 40000-40100 2222-2222 ");
    EXPECT_EQ(login(), "2121-2121 2222-2222 ") << "who cannot log in has no use for the others";
    storeFtp(4);
    EXPECT_EQ(open(), "2222-2222 ");
}

TEST_F(EnabledPorts, AreUnknownWhereSettingsAreDamaged) {
    root_.write("etc/velt/ftp.conf", "nonsense");
    EXPECT_NE(open().find("ftp.conf"), std::string::npos) << open();
}

} // namespace
} // namespace velt::test
