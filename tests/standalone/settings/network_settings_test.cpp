#include "standalone/settings/settings.h"

#include "tests/standalone/settings/settings_fixture.h"

namespace velt {
namespace {

class NetworkSettingsFile : public test::SettingsTest {
protected:
    static std::string problem() {
        const auto settings = loadNetworkSettings();
        return settings ? "" : settings.error().message;
    }
};

TEST_F(NetworkSettingsFile, IsOptional) {
    const auto settings = loadNetworkSettings();
    ASSERT_TRUE(settings) << settings.error().message;
    EXPECT_FALSE(settings->loopbackOnly);
}

TEST_F(NetworkSettingsFile, KeepsTheServicesOnTheLoopback) {
    root_.write("etc/velt/network.conf", "# A trial.\nversion = 1\nloopback_only = 1\n");
    const auto settings = loadNetworkSettings();
    ASSERT_TRUE(settings) << settings.error().message;
    EXPECT_TRUE(settings->loopbackOnly);
}

TEST_F(NetworkSettingsFile, IsNeverGuessed) {
    const std::string file = "Cannot read " + place("/etc/velt/network.conf");
    root_.write("etc/velt/network.conf", "version = 1\nloopback_only = yes\n");
    EXPECT_EQ(problem(), file + ", line 2: loopback_only: expected 0 or 1.");
    root_.write("etc/velt/network.conf", "version = 1\n");
    EXPECT_EQ(problem(), file + ": missing key \"loopback_only\".");
    root_.write("etc/velt/network.conf", "version = 1\nloopback_only = 0\nlisten = 192.0.2.1\n");
    EXPECT_EQ(problem(), file + ", line 3: unknown key \"listen\".");
}

} // namespace
} // namespace velt
