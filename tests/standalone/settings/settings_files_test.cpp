#include "standalone/settings/settings_files.h"

#include <gtest/gtest.h>

#include <cstring>
#include <random>

namespace velt {
namespace {

constexpr const char* goldenFtp =
    R"(# FTP and FTPS settings of this server. The file is written anew whenever the administration changes a
# setting; a change made here by hand takes effect when the service is started the next time.
version = 1

# The control port.
port = "21"

# Services that are on: 1 FTP, 2 FTPS, 3 both.
service_flags = 0

# Ports for passive transfers; 0 and 0: the default range, 55536 to 55899.
passive_port_min = 0
passive_port_max = 0

# Passive mode announces the address ftp_ext_ip of veltinfo.conf.
use_ext_ip = 0

# Limits for each session, in KB/s of 1024 bytes; 0: no limit. In force while enable_flow_ctrl is 1.
enable_flow_ctrl = 0
maxuploadrate = 0
maxdownloadrate = 0

# Connections from one address; 0: no limit.
max_conn_per_ip = 0

# Transfers from server to server.
enable_fxp = 0

# File names in UTF-8: support_utf8 offers it, use_utf8 uses it from the start.
support_utf8 = 1
use_utf8 = 1

# FIPS-approved algorithms only.
fips = 0

# ASCII transfers convert line ends.
ascii = 0

# Uploads get the server's umask.
umask = 1

# An idle session ends after so many seconds; 0: never.
timeout = 300

# Anonymous login, and the share that it is confined to.
anonymous = 0
anonymous_chroot = 0
anonymous_chroot_share = ""

# Users are confined to their home folders.
user_chroot = 0

# Kept for programs that use it.
reserved = 0
)";

constexpr const char* goldenSftp =
    R"(# SFTP settings of this server. The file is written anew whenever the administration changes a
# setting; a change made here by hand takes effect when the service is started the next time.
version = 1

# The service is on.
enabled = 0

# Its port.
port = 22
)";

std::string replaced(std::string text, const std::string& from, const std::string& to) {
    const auto at = text.find(from);
    EXPECT_NE(at, std::string::npos) << from;
    return at == std::string::npos ? text : text.replace(at, from.size(), to);
}

std::string problemOf(const std::string& text) {
    const auto settings = parseFtpSettings("ftp.conf", text);
    return settings ? "" : settings.error().message;
}

bool isSameRecord(const _tag_VELT_FTP_CONF_& a, const _tag_VELT_FTP_CONF_& b) {
    return std::memcmp(&a, &b, sizeof(a)) == 0;
}

TEST(SettingsFiles, TheDefaultsAsText) {
    EXPECT_EQ(formatFtpSettings(defaultFtpSettings()), goldenFtp);
    EXPECT_EQ(formatSftpSettings({}), goldenSftp);
}

TEST(SettingsFiles, ValuesAsText) {
    FtpSettings settings = defaultFtpSettings();
    std::strcpy(settings.record.anonymous_chroot_share, "Bücher \"alt\"\nport = 1");
    settings.record.service_flags = -2147483647 - 1;
    settings.record.reserved = 2147483647;
    settings.useUtf8 = false;
    const std::string text = formatFtpSettings(settings);

    EXPECT_NE(text.find("\nanonymous_chroot_share = \"Bücher \\\"alt\\\"\\x0aport = 1\"\n"),
              std::string::npos);
    EXPECT_NE(text.find("\nservice_flags = -2147483648\n"), std::string::npos);
    EXPECT_NE(text.find("\nreserved = 2147483647\n"), std::string::npos);
    EXPECT_NE(text.find("\nuse_utf8 = 0\n"), std::string::npos);
}

TEST(SettingsFiles, BytesBehindTheEndOfATextAreKept) {
    FtpSettings settings = defaultFtpSettings();
    std::memcpy(settings.record.portnum, "21\0001\0\0\0", 8);
    const std::string text = formatFtpSettings(settings);

    EXPECT_NE(text.find("\nport = \"21\\x001\"\n"), std::string::npos);
    const auto read = parseFtpSettings("ftp.conf", text);
    ASSERT_TRUE(read) << read.error().message;
    EXPECT_TRUE(isSameRecord(read->record, settings.record));
}

TEST(SettingsFiles, ARecordOfAnyBytesComesBackTheSame) {
    std::mt19937 random(556);
    std::uniform_int_distribution<int> byte(0, 255);
    for (int i = 0; i < 500; ++i) {
        unsigned char bytes[sizeof(_tag_VELT_FTP_CONF_)];
        for (unsigned char& one : bytes)
            one = static_cast<unsigned char>(byte(random));
        FtpSettings settings;
        std::memcpy(&settings.record, bytes, sizeof(bytes));
        settings.timeout = byte(random) - 100;
        settings.useUtf8 = i % 2 == 0;
        settings.fipsOnly = i % 3 == 0;
        settings.ascii = i % 5 == 0;
        settings.umask = i % 7 == 0;

        const auto read = parseFtpSettings("ftp.conf", formatFtpSettings(settings));
        ASSERT_TRUE(read) << read.error().message;
        ASSERT_TRUE(isSameRecord(read->record, settings.record));
        EXPECT_EQ(read->timeout, settings.timeout);
        EXPECT_EQ(read->useUtf8, settings.useUtf8);
        EXPECT_EQ(read->fipsOnly, settings.fipsOnly);
        EXPECT_EQ(read->ascii, settings.ascii);
        EXPECT_EQ(read->umask, settings.umask);
    }
}

TEST(SettingsFiles, AHandWrittenFileMayBeSpacedAndOrderedOtherwise) {
    const auto read =
        parseSftpSettings("sftp.conf", "port=2022\r\n\t# mine\r\n   enabled\t =  1 \r\nversion=1");
    ASSERT_TRUE(read) << read.error().message;
    EXPECT_TRUE(read->enabled);
    EXPECT_EQ(read->port, 2022);
}

TEST(SettingsFiles, EveryMissingKeyIsNamed) {
    const std::string golden = goldenFtp;
    int keys = 0;
    for (std::size_t at = 0; at < golden.size();) {
        const std::string line = golden.substr(at, golden.find('\n', at) - at);
        at += line.size() + 1;
        if (line.empty() || line.front() == '#')
            continue;
        const std::string key = line.substr(0, line.find(' '));
        EXPECT_EQ(problemOf(replaced(golden, "\n" + line + "\n", "\n")),
                  "Cannot read ftp.conf: missing key \"" + key + "\".");
        ++keys;
    }
    EXPECT_EQ(keys, 22);
}

TEST(SettingsFiles, DamageIsNamedByFileAndLine) {
    const struct {
        const char* from;
        const char* to;
        const char* problem;
    } cases[] = {
        {"timeout = 300", "timeout = 3oo",
         "line 43: timeout: expected a number from -2147483648 to 2147483647"},
        {"timeout = 300", "timeout =", "line 43: timeout: expected a number from -2147483648 to 2147483647"},
        {"timeout = 300", "timeout = 2147483648",
         "line 43: timeout: expected a number from -2147483648 to 2147483647"},
        {"timeout = 300", "timeout = +1",
         "line 43: timeout: expected a number from -2147483648 to 2147483647"},
        {"timeout = 300", "timeout 300", "line 43: expected \"key = value\""},
        {"timeout = 300", "= 300", "line 43: expected \"key = value\""},
        {"timeout = 300", "timeout = 300\ntime_out = 3", "line 44: unknown key \"time_out\""},
        {"timeout = 300", "timeout = 300\ntimeout = 3", "line 44: duplicate key \"timeout\""},
        {"umask = 1", "umask = yes", "line 40: umask: expected 0 or 1"},
        {"umask = 1", "umask = 2", "line 40: umask: expected 0 or 1"},
        {"port = \"21\"", "port = 21", "line 6: port: expected a text in double quotes"},
        {"port = \"21\"", "port = \"123456789\"", "line 6: port: expected at most 8 bytes"},
        {"version = 1", "version = 2",
         "line 3: version 2 is newer than this program, which knows files up to version 1"},
        {"version = 1", "version = 0", "line 3: version: expected 1"},
    };
    for (const auto& one : cases)
        EXPECT_EQ(problemOf(replaced(goldenFtp, one.from, one.to)),
                  std::string("Cannot read ftp.conf, ") + one.problem + ".");
}

TEST(SettingsFiles, AnEmptyOrOverwrittenFileIsDamaged) {
    EXPECT_EQ(problemOf(""), "Cannot read ftp.conf: missing key \"version\".");
    EXPECT_EQ(problemOf(std::string(4096, '\0')), "Cannot read ftp.conf, line 1: expected \"key = value\".");
    EXPECT_EQ(problemOf("\x7f"
                        "ELF\x02\x01"),
              "Cannot read ftp.conf, line 1: expected \"key = value\".");
}

TEST(SettingsFiles, ANewerVersionIsRefusedWhateverElseItHolds) {
    EXPECT_EQ(problemOf("version = 7\nport = 21\nsomething_new = {}\n"),
              "Cannot read ftp.conf, line 1: version 7 is newer than this program, which knows files up to "
              "version 1.");
}

TEST(SettingsFiles, EveryTruncationIsRefused) {
    const std::string golden = goldenFtp;
    // Without the last line end the last value is still whole.
    for (std::size_t length = 0; length < golden.size() - 1; ++length)
        ASSERT_FALSE(parseFtpSettings("ftp.conf", golden.substr(0, length))) << length;
}

} // namespace
} // namespace velt
