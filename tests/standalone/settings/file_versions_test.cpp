// Files that earlier versions wrote, or that were written for them, stay readable.
#include "standalone/firewall/firewall_settings.h"
#include "standalone/journal/log_retention.h"
#include "standalone/settings/settings.h"
#include "standalone/settings/settings_files.h"
#include "tests/standalone/settings/settings_fixture.h"
#include "tests/support/files.h"

namespace velt {
namespace {

std::string versionOne(const std::string& name) {
    std::string text = test::contentsOf(VERSION_1_FILES "/" + name);
    EXPECT_NE(text, "") << name;
    return text;
}

class FileVersions1 : public test::SettingsTest {
protected:
    FileVersions1() {
        for (const std::string name : {"ftp.conf", "sftp.conf", "network.conf", "firewall.conf", "log.conf"})
            root_.write("etc/velt/" + name, versionOne(name));
    }
};

void expectTransfersOfVersionOne(const _tag_VELT_FTP_CONF_& record) {
    EXPECT_STREQ(record.portnum, "2121");
    EXPECT_EQ(record.service_flags, 3);
    EXPECT_EQ(record.passive_port_min, 50000);
    EXPECT_EQ(record.passive_port_max, 50100);
    EXPECT_EQ(record.use_ext_ip, 1);
    EXPECT_EQ(record.enable_flow_ctrl, 1);
    EXPECT_EQ(record.maxuploadrate, 1000);
    EXPECT_EQ(record.maxdownloadrate, -1);
    EXPECT_EQ(record.max_conn_per_ip, 5);
    EXPECT_EQ(record.enable_fxp, 1);
}

void expectVersionOne(const FtpSettings& settings) {
    const auto& record = settings.record;
    expectTransfersOfVersionOne(record);
    EXPECT_EQ(record.support_utf8, 1);
    EXPECT_FALSE(settings.useUtf8);
    EXPECT_TRUE(settings.fipsOnly);
    EXPECT_TRUE(settings.ascii);
    EXPECT_FALSE(settings.umask);
    EXPECT_EQ(settings.timeout, 60);
    EXPECT_EQ(record.anonymous, 1);
    EXPECT_EQ(record.anonymous_chroot, 1);
    EXPECT_STREQ(record.anonymous_chroot_share, "Bücher \"alt\"");
    EXPECT_EQ(record.user_chroot, 1);
    EXPECT_EQ(record.reserved, 7);
}

TEST_F(FileVersions1, AreReadToday) {
    const auto ftp = loadFtpSettings();
    ASSERT_TRUE(ftp) << ftp.error().message;
    expectVersionOne(*ftp);
    const auto sftp = loadSftpSettings();
    ASSERT_TRUE(sftp) << sftp.error().message;
    EXPECT_TRUE(sftp->enabled);
    EXPECT_EQ(sftp->port, 2222);
    const auto network = loadNetworkSettings();
    ASSERT_TRUE(network) << network.error().message;
    EXPECT_TRUE(network->loopbackOnly);
    const auto firewall = loadFirewallSettings();
    ASSERT_TRUE(firewall);
    EXPECT_EQ(firewall->mode, FirewallMode::drop);
    ASSERT_EQ(firewall->furtherPorts.size(), 3U);
    EXPECT_EQ(firewall->furtherPorts[2].first, 8000);
    EXPECT_EQ(firewall->furtherPorts[2].last, 8010);
    const auto retention = loadRetention();
    ASSERT_TRUE(retention);
    EXPECT_EQ(retention->maxEntries, 50000);
    EXPECT_EQ(retention->maxAgeDays, 730);
}

// What a later version may add.
constexpr schema::Setting laterSetting{.fileKey = "max_login_attempts",
                                       .type = schema::SettingType::number,
                                       .meaning = "Failed logins after which a session ends",
                                       .least = 1,
                                       .most = 20,
                                       .number = 3,
                                       .since = 2};
std::int32_t laterValue = 0;

SettingsFile<FtpSettings> laterFtpFile() {
    SettingsFile<FtpSettings> file = ftpSettingsFile();
    file.settings.push_back({&laterSetting, [](FtpSettings&) -> std::int32_t& { return laterValue; }});
    file.version = laterSetting.since;
    return file;
}

Result<FtpSettings> readByLaterVersion(const std::string& text) {
    laterValue = 0;
    Result<StrictFile> file = StrictFile::parse("ftp.conf", text, {laterFtpFile().version});
    if (!file)
        return file.error();
    return readSettings(laterFtpFile(), *file);
}

TEST(LaterVersion, ReadsAFileOfVersionOneWithItsOwnDefaults) {
    const auto settings = readByLaterVersion(versionOne("ftp.conf"));
    ASSERT_TRUE(settings) << settings.error().message;
    expectVersionOne(*settings);
    EXPECT_EQ(laterValue, 3);
}

TEST(LaterVersion, WritesAndReadsItsOwnFiles) {
    laterValue = 7;
    const std::string text = formatSettings(laterFtpFile(), defaultFtpSettings());
    EXPECT_NE(text.find("\nversion = 2\n"), std::string::npos) << text;
    EXPECT_NE(text.find("\n# Failed logins after which a session ends (1 to 20, default 3).\n"
                        "max_login_attempts = 7\n"),
              std::string::npos)
        << text;
    ASSERT_TRUE(readByLaterVersion(text));
    EXPECT_EQ(laterValue, 7);
}

TEST(LaterVersion, MissesItsKeyInAFileOfItsOwn) {
    std::string text = versionOne("ftp.conf");
    text.replace(text.find("version = 1"), 11, "version = 2");
    const auto settings = readByLaterVersion(text);
    ASSERT_FALSE(settings);
    EXPECT_EQ(settings.error().message, "Cannot read ftp.conf: missing key \"max_login_attempts\".");
}

TEST(LaterVersion, IsNamedByThisOne) {
    laterValue = 7;
    const auto file = StrictFile::parse("ftp.conf", formatSettings(laterFtpFile(), defaultFtpSettings()),
                                        {ftpSettingsFile().version});
    ASSERT_FALSE(file);
    EXPECT_EQ(file.error().message, "Cannot read ftp.conf, line 3: version 2 is newer than this program, "
                                    "which knows files up to version 1.");
}

} // namespace
} // namespace velt
