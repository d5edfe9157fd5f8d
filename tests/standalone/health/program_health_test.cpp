// What is found about the files of this system that services need.
#include "standalone/settings/confinement_settings.h"
#include "standalone/settings/settings_store.h"
#include "tests/standalone/health/health_test.h"
#include "tests/standalone/support/state_folder.h"
#include "tests/support/result.h"

#include <gtest/gtest.h>
#include <sys/stat.h>

#include <cstdlib>
#include <string>

namespace velt::test {
namespace {

class ProgramHealth : public testing::Test {
protected:
    void SetUp() override {
        const char* before = std::getenv("VELT_LIBEXEC_DIR");
        before_ = before == nullptr ? "" : before;
        ASSERT_EQ(::setenv("VELT_LIBEXEC_DIR", (root_.path() / "programs").c_str(), 1), 0);
        for (const char* each : {"velt-login-view", "velt-authorized-keys", "velt-supervise"}) {
            setMode(root_.write(std::string("programs/") + each, ""), 0755);
        }
        setMode(root_.write("programs/mod_velt_login.so", ""), 0644);
        switchOn(true, true);
    }

    void TearDown() override {
        if (before_.empty()) {
            ::unsetenv("VELT_LIBEXEC_DIR");
        } else {
            ::setenv("VELT_LIBEXEC_DIR", before_.c_str(), 1);
        }
    }

    static void setMode(const std::filesystem::path& file, mode_t mode) {
        ASSERT_EQ(::chmod(file.c_str(), mode), 0);
    }

    static void switchOn(bool ftp, bool sftp) {
        FtpSettings settings = defaultFtpSettings();
        settings.record.service_flags = ftp ? VELT_FTP_SERVICE_PLAIN : 0;
        ASSERT_EQ(messageOf(storeFtpSettings(settings)), "");
        ASSERT_EQ(messageOf(storeSftpSettings({sftp, 2222})), "");
    }

    std::filesystem::path program(const std::string& name) const { return root_.path() / "programs" / name; }

    StateFolder root_;
    std::string before_;
};

TEST_F(ProgramHealth, ThatAreInstalledAreWell) {
    EXPECT_EQ(programFindings(), Findings());
}

TEST_F(ProgramHealth, TheProgramOfTheViewThatCannotBeRunKeepsEverybodyOut) {
    setMode(program("velt-login-view"), 0644);
    const std::string path = program("velt-login-view").string();
    EXPECT_EQ(programFindings(),
              (Findings{{"program-unusable", Severity::error, "ftp",
                         path + " cannot be run: Permission denied. Nobody can log in over FTP.",
                         "chmod 755 " + path}}));
    std::filesystem::remove(path);
    EXPECT_EQ(programFindings(), (Findings{{"program-unusable", Severity::error, "ftp",
                                            path + " is missing. Nobody can log in over FTP.",
                                            "Install this system again, then run: veltctl doctor"}}));
    switchOn(false, true);
    EXPECT_EQ(programFindings(), Findings()) << "who does not serve needs none";
}

TEST_F(ProgramHealth, TheProgramForKeysThatCannotBeRunIsNamed) {
    setMode(program("velt-authorized-keys"), 0600);
    const Findings found = programFindings();
    EXPECT_EQ(summary(found), "error program-unusable");
    EXPECT_EQ(found.at(0).subject, "sftp");
    EXPECT_EQ(found.at(0).mend, "chmod 755 " + program("velt-authorized-keys").string());
}

TEST_F(ProgramHealth, TheModuleAndTheSupervisorAreNeededForTheNextStart) {
    std::filesystem::remove(program("mod_velt_login.so"));
    std::filesystem::create_directory(program("mod_velt_login.so"));
    std::filesystem::remove(program("velt-supervise"));
    const Findings found = programFindings();
    EXPECT_EQ(summary(found), "error program-unusable, error program-unusable, error program-unusable");
    EXPECT_EQ(found.at(0).sentence,
              program("mod_velt_login.so").string() + " is not a file. FTP cannot be started again.");
    EXPECT_EQ(found.at(2).subject, "sftp");
}

TEST_F(ProgramHealth, WhatConfinesSftpIsNeededWhereItIsConfined) {
    std::filesystem::remove(program("velt-login-view"));
    switchOn(false, true);
    EXPECT_EQ(programFindings(), Findings());
    ASSERT_EQ(messageOf(storeConfinementSettings({.sftp = true})), "");
    const Findings found = programFindings();
    EXPECT_EQ(summary(found), "error program-unusable, error program-unusable");
    EXPECT_EQ(found.at(0).sentence, program("velt-login-view").string() +
                                        " is missing. Nobody can log in over SFTP while it is confined.");
    EXPECT_EQ(found.at(1).sentence, program("velt-sftp-session.so").string() +
                                        " is missing. SFTP cannot be started again while it is confined.");
}

TEST_F(ProgramHealth, SftpThatIsNotConfinedIsWorthKnowing) {
    EXPECT_EQ(
        confinementFindings(),
        (Findings{{"sftp-not-confined", Severity::notice, "sftp",
                   "SFTP is not confined: its users see the whole server as far as Unix modes let them, "
                   "whatever the rules and the shares grant.",
                   "veltctl confinement set sftp=on"}}));
    switchOn(true, false);
    EXPECT_EQ(confinementFindings(), Findings()) << "nobody uses it";
    switchOn(true, true);
    ASSERT_EQ(messageOf(storeConfinementSettings({.sftp = true})), "");
    EXPECT_EQ(confinementFindings(), Findings());
}

} // namespace
} // namespace velt::test
