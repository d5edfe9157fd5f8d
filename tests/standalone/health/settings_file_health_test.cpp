// What is found about the files of settings.
#include "standalone/settings/settings_store.h"
#include "tests/standalone/health/health_test.h"
#include "tests/standalone/support/state_folder.h"
#include "tests/support/result.h"

#include <gtest/gtest.h>

#include <string>

namespace velt::test {
namespace {

class SettingsFileHealth : public testing::Test {
protected:
    void SetUp() override {
        ASSERT_EQ(messageOf(storeFtpSettings(defaultFtpSettings())), "");
        ASSERT_EQ(messageOf(storeSftpSettings(defaultSftpSettings())), "");
    }

    std::string path(const std::string& file) const { return (root_.path() / "etc/velt" / file).string(); }

    StateFolder root_;
};

TEST_F(SettingsFileHealth, NothingIsWrongWithDefaults) {
    EXPECT_EQ(settingsFileFindings(), Findings());
}

TEST_F(SettingsFileHealth, AValueThatNoDaemonTakesIsNamed) {
    FtpSettings ftp = defaultFtpSettings();
    ftp.timeout = -4;
    ASSERT_EQ(messageOf(storeFtpSettings(ftp)), "");
    ASSERT_EQ(messageOf(storeSftpSettings({true, 70000})), "");
    const Findings found = settingsFileFindings();
    ASSERT_EQ(summary(found), "warning settings-refused, warning settings-refused");
    EXPECT_TRUE(found.at(0).sentence.starts_with("The FTP setting timeout is -4; expected "))
        << found.at(0).sentence;
    EXPECT_EQ(found.at(0).mend, "Correct " + path("ftp.conf") + ", then run: veltctl doctor");
    EXPECT_EQ(found.at(1).subject, "sftp");
    EXPECT_EQ(found.at(1).mend, "Correct " + path("sftp.conf") + ", then run: veltctl doctor");
}

TEST_F(SettingsFileHealth, FilesThatCannotBeReadAreNamedWithTheLine) {
    for (const char* file :
         {"network.conf", "bans.conf", "log.conf", "transfers.conf", "known_services.conf"}) {
        root_.write(std::string("etc/velt/") + file, "\njunk\n");
        const Findings found = settingsFileFindings();
        ASSERT_EQ(summary(found), "warning settings-damaged") << file;
        EXPECT_TRUE(found.at(0).sentence.starts_with("Cannot read " + path(file) + ", line 2: expected "))
            << found.at(0).sentence;
        EXPECT_EQ(found.at(0).mend, "Correct " + path(file) + ", then run: veltctl doctor");
        std::filesystem::remove(path(file));
    }
}

} // namespace
} // namespace velt::test
