#include "standalone/settings/network_settings.h"

#include "standalone/core/last_error.h"
#include "tests/standalone/settings/settings_fixture.h"

namespace velt {
namespace {

class NetworkSettingsFile : public test::SettingsTest {};

TEST_F(NetworkSettingsFile, IsOptional) {
    const auto settings = loadNetworkSettings();
    ASSERT_TRUE(settings) << lastErrorSentence();
    EXPECT_FALSE(settings->loopbackOnly);
}

TEST_F(NetworkSettingsFile, KeepsTheServicesOnTheLoopback) {
    root_.write("etc/velt/network.conf", "# A trial.\nversion = 1\nloopback_only = 1\n");
    const auto settings = loadNetworkSettings();
    ASSERT_TRUE(settings) << lastErrorSentence();
    EXPECT_TRUE(settings->loopbackOnly);
}

TEST_F(NetworkSettingsFile, IsNeverGuessed) {
    const std::string file = "Settings file " + place("/etc/velt/network.conf");
    root_.write("etc/velt/network.conf", "version = 1\nloopback_only = yes\n");
    EXPECT_FALSE(loadNetworkSettings());
    EXPECT_EQ(lastErrorSentence(), file + ", line 2: the value of loopback_only is neither 0 nor 1.");
    root_.write("etc/velt/network.conf", "version = 1\n");
    EXPECT_FALSE(loadNetworkSettings());
    EXPECT_EQ(lastErrorSentence(), file + ": the key loopback_only is missing.");
    root_.write("etc/velt/network.conf", "version = 1\nloopback_only = 0\nlisten = 192.0.2.1\n");
    EXPECT_FALSE(loadNetworkSettings());
    EXPECT_EQ(lastErrorSentence(), file + ", line 3: the key \"listen\" is not known.");
}

} // namespace
} // namespace velt
