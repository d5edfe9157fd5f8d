#include "platform/core.h"
#include "platform/sftp.h"
#include "standalone/rules/rule_store.h"
#include "standalone/settings/confinement_settings.h"
#include "standalone/settings/settings.h"
#include "standalone/settings/settings_files.h"
#include "standalone/settings/settings_store.h"
#include "standalone/standalone.h"
#include "tests/standalone/settings/settings_fixture.h"
#include "tests/support/result.h"

#include <sys/stat.h>

namespace velt {
namespace {

using test::messageOf;

class SettingsStore : public test::SettingsTest {};

TEST_F(SettingsStore, TheFirstOpeningWritesTheDefaults) {
    ASSERT_EQ(messageOf(openState(root_.path())), "");
    EXPECT_EQ(root_.read("etc/velt/ftp.conf"), formatSettings(ftpSettingsFile(), defaultFtpSettings()));
    EXPECT_EQ(root_.read("etc/velt/sftp.conf"), formatSettings(sftpSettingsFile(), defaultSftpSettings()));
    struct stat status {};
    ASSERT_EQ(::stat(place("/etc/velt/ftp.conf").c_str(), &status), 0);
    EXPECT_EQ(status.st_mode & 0777, 0644U);
}

TEST_F(SettingsStore, ALaterOpeningLeavesWhatIsThere) {
    root_.write("etc/velt/ftp.conf", "damaged");
    ASSERT_EQ(messageOf(openState(root_.path())), "");
    EXPECT_EQ(root_.read("etc/velt/ftp.conf"), "damaged");
    EXPECT_EQ(root_.read("etc/velt/sftp.conf"), formatSettings(sftpSettingsFile(), defaultSftpSettings()));
}

TEST_F(SettingsStore, TheFirstOpeningOfANewServerConfinesSftp) {
    ASSERT_EQ(messageOf(openState(root_.path())), "");
    EXPECT_TRUE(loadConfinementSettings()->sftp);
    ASSERT_EQ(messageOf(storeConfinementSettings({.sftp = false})), "");
    std::filesystem::remove(place("/var/lib/velt/initialized"));
    ASSERT_EQ(messageOf(openState(root_.path())), "");
    EXPECT_FALSE(loadConfinementSettings()->sftp) << "its administrator has decided";
}

TEST_F(SettingsStore, AServerOfAFormerVersionServesSftpAsBefore) {
    for (const char* trace : {"etc/velt/ftp.conf", "etc/velt/sftp.conf", "var/lib/velt/initialized"}) {
        const test::TemporaryFolder root;
        root.write(trace, "");
        ASSERT_EQ(messageOf(openState(root.path())), "");
        EXPECT_FALSE(loadConfinementSettings()->sftp) << trace;
        EXPECT_FALSE(std::filesystem::exists(root.path() / "etc/velt/confinement.conf")) << trace;
    }
    setStateRoot(root_.path());
}

TEST_F(SettingsStore, TheConfinementIsReadStrictly) {
    for (const char* text :
         {"sftp = 1\n", "version = 1\nsftp = yes\n", "version = 1\n", "version = 1\nsftp = 1\nftp = 1\n"}) {
        root_.write("etc/velt/confinement.conf", text);
        EXPECT_FALSE(loadConfinementSettings()) << text;
    }
}

TEST_F(SettingsStore, TheFirstOpeningMakesAnEmptySetOfRulesAndLaterOnesMissIt) {
    ASSERT_EQ(messageOf(openState(root_.path())), "");
    EXPECT_EQ(root_.read("etc/velt/chroot_rules"), "velt-chroot-rules 1\n");
    std::filesystem::remove(place("/etc/velt/chroot_rules"));
    ASSERT_EQ(messageOf(openState(root_.path())), "");
    EXPECT_FALSE(loadRules()) << "nobody is confined by an empty file in place of the lost one";
}

TEST_F(SettingsStore, AnInstallationOfAFormerVersionHasNoRulesBeforeFtpWasSwitchedOn) {
    ASSERT_EQ(messageOf(storeFtpSettings(defaultFtpSettings())), "");
    ASSERT_EQ(messageOf(openState(root_.path())), "");
    EXPECT_EQ(loadRules(), std::vector<ChrootRule>());
}

TEST_F(SettingsStore, WhereFtpIsOnOrCannotBeToldARuleFileWasThere) {
    FtpSettings on = defaultFtpSettings();
    on.record.service_flags = VELT_FTP_SERVICE_PLAIN;
    for (const std::string& settings : {formatSettings(ftpSettingsFile(), on), std::string("damaged")}) {
        const test::TemporaryFolder root;
        root.write("etc/velt/ftp.conf", settings);
        ASSERT_EQ(messageOf(openState(root.path())), "");
        EXPECT_FALSE(loadRules()) << settings;
    }
    setStateRoot(root_.path());
}

TEST_F(SettingsStore, AnOpeningThatCannotWriteSaysWhy) {
    root_.write("etc", "a file where a folder should be");
    EXPECT_EQ(messageOf(openState(root_.path())),
              "Cannot make the folder " + place("/etc/velt") + ": Not a directory.");
}

TEST_F(SettingsStore, TheExternalAddressComesFromTheSystemInformation) {
    EXPECT_EQ(loadFtpSettings()->externalAddress, "");
    root_.write("etc/veltinfo.conf", "ftp_ext_ip = \"203.0.113.7\"\n");
    EXPECT_EQ(loadFtpSettings()->externalAddress, "203.0.113.7");
}

TEST_F(SettingsStore, ADamagedExternalAddressIsAnErrorThatCanBeRepaired) {
    root_.write("etc/veltinfo.conf", "ftp_ext_ip=eth0\n");
    const auto settings = loadFtpSettings();
    ASSERT_FALSE(settings);
    EXPECT_EQ(settings.error().message,
              "Cannot read " + place("/etc/veltinfo.conf") + ": ftp_ext_ip: expected an IPv4 address.");
    ASSERT_GE(VLIBCINFOSetKeyValue("ftp_ext_ip", "203.0.113.7"), 0) << lastErrorSentence();
    EXPECT_EQ(loadFtpSettings()->externalAddress, "203.0.113.7");
}

TEST_F(SettingsStore, AnUnreadableFileIsNoMissingFile) {
    std::filesystem::create_directories(place("/etc/velt/ftp.conf"));
    const auto settings = loadFtpSettings();
    ASSERT_FALSE(settings);
    EXPECT_EQ(settings.error().message, "Cannot read " + place("/etc/velt/ftp.conf") + ": Is a directory.");
}

TEST_F(SettingsStore, AHandEditedValueThatNoDaemonTakesIsRepairedByStoringAGoodOne) {
    std::string text = formatSettings(ftpSettingsFile(), defaultFtpSettings());
    text.replace(text.find("timeout = 300"), 13, "timeout = -30");
    root_.write("etc/velt/ftp.conf", text);
    EXPECT_EQ(VELTFTPTimeOutGet(), -30);
    EXPECT_LT(VELTFTPASCIIEnabledSet(1), 0);
    EXPECT_GE(VELTFTPTimeOutSet(30), 0);
    EXPECT_GE(VELTFTPASCIIEnabledSet(1), 0);
}

TEST_F(SettingsStore, TheDaemonIsAskedAboutSftpSettingsThatItIsToServe) {
    ASSERT_GE(VELTSFTPConfigSet(0, 2201), 0) << lastErrorSentence();
    EXPECT_EQ(test::fakeCandidate().sftp.size(), 0U) << "what is off may need what is not there yet";
    ASSERT_GE(VELTSFTPConfigSet(1, 2202), 0) << lastErrorSentence();
    ASSERT_EQ(test::fakeCandidate().sftp.size(), 1U);
    EXPECT_EQ(test::fakeCandidate().sftp[0].port, 2202);
    test::fakeCandidate().refuses = true;
    EXPECT_LT(VELTSFTPConfigSet(1, 2203), 0);
    EXPECT_EQ(lastErrorSentence(), "The daemon does not take it.");
    EXPECT_EQ(loadSftpSettings()->port, 2202);
}

} // namespace
} // namespace velt
