#include "standalone/bans/ban_settings.h"

#include "tests/standalone/support/state_folder.h"
#include "tests/support/result.h"

#include <gtest/gtest.h>

#include <string>
#include <utility>

namespace velt {
namespace {

class BanSettingsFile : public testing::Test {
protected:
    Result<BanSettings> load(const std::string& text) {
        root_.write("etc/velt/bans.conf", text);
        return loadBanSettings();
    }

    test::StateFolder root_;
};

/// "ENABLED FAILURES WINDOW BAN NETWORK..."
std::string describe(const Result<BanSettings>& settings) {
    if (!settings) {
        return settings.error().message;
    }
    std::string text = std::to_string(settings->enabled) + " " + std::to_string(settings->failures) + " " +
                       std::to_string(settings->window.count()) + " " + std::to_string(settings->ban.count());
    for (const IpNetwork& network : settings->never) {
        text += " " + toText(network);
    }
    return text;
}

TEST_F(BanSettingsFile, IsReadAsWritten) {
    EXPECT_EQ(describe(loadBanSettings()), "1 10 600 600") << "without a file";
    EXPECT_EQ(describe(load("version = 1\n")), "1 10 600 600");
    EXPECT_EQ(
        describe(load("version = 1\nenabled = 0\nfailures = 3\nwindow_seconds = 60\nban_seconds = 3600\n"
                      "never = \"192.0.2.0/24  2001:db8::/32 198.51.100.7\" # ours\n")),
        "0 3 60 3600 192.0.2.0/24 2001:db8::/32 198.51.100.7");
    EXPECT_EQ(describe(load("version = 1\nfailures = 1\nnever = \"\"\n")), "1 1 600 600");
}

TEST_F(BanSettingsFile, ThatIsDamagedIsNamedWithItsLine) {
    const std::string networks = "never: expected addresses and networks separated by spaces, such as "
                                 "192.0.2.0/24";
    const std::pair<const char*, std::string> damaged[] = {
        {"failures = 3\n", ": missing key \"version\""},
        {"version = 1\nfailures = 0\n", ", line 2: failures: expected a number from 1 to 1000"},
        {"version = 1\nwindow_seconds = 0\n", ", line 2: window_seconds: expected a number from 1 to 86400"},
        {"version = 1\nban_seconds = 2592001\n",
         ", line 2: ban_seconds: expected a number from 1 to 2592000"},
        {"version = 1\nnever = \"192.0.2.1/24\"\n", ", line 2: " + networks},
        {"version = 1\nnever = \"192.0.2.0/24,10.0.0.1\"\n", ", line 2: " + networks},
        {"version = 1\nattempts = 3\n", ", line 2: unknown key \"attempts\""},
    };
    for (const auto& [text, complaint] : damaged) {
        EXPECT_EQ(test::messageOf(load(text)),
                  "Cannot read " + (root_.path() / "etc/velt/bans.conf").string() + complaint + ".");
    }
}

} // namespace
} // namespace velt
