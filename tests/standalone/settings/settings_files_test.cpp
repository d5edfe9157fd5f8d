#include "standalone/settings/settings_files.h"

#include <gtest/gtest.h>

#include <cstring>
#include <random>

namespace velt {
namespace {

constexpr const char* goldenFtp =
    R"(# FTP settings of this server. This file is rewritten whenever a setting is changed. An edit made here
# takes effect when the service starts next.
version = 1

# Enabled services: 0 none, 1 FTP, 2 FTPS, 3 both (default 0).
service_flags = 0

# Idle time after which a session ends; 0 means never (seconds, 0 to 86400, default 300).
timeout = 300

# Port of FTP and FTPS (1 to 65535, default 21).
port = "21"

# First port for passive transfers; 0 means the default range (0 to 65535, default 0).
passive_port_min = 0

# Last port for passive transfers; 0 means the default range (0 to 65535, default 0).
passive_port_max = 0

# Passive mode announces the external address (0 or 1, default 0).
use_ext_ip = 0

# File names may be in UTF-8 (0 or 1, default 1).
support_utf8 = 1

# File names are in UTF-8 from the start (0 or 1, default 1).
use_utf8 = 1

# Transfers between two servers are allowed (0 or 1, default 0).
enable_fxp = 0

# ASCII transfers convert line ends (0 or 1, default 0).
ascii = 0

# Only algorithms approved by FIPS are used (0 or 1, default 0).
fips = 0

# The limits maxuploadrate and maxdownloadrate are in force (0 or 1, default 0).
enable_flow_ctrl = 0

# Upload limit of a session; 0 means no limit (KB/s of 1024 bytes, 0 or more, default 0).
maxuploadrate = 0

# Download limit of a session; 0 means no limit (KB/s of 1024 bytes, 0 or more, default 0).
maxdownloadrate = 0

# Connections from one client address; 0 means no limit (0 or more, default 0).
max_conn_per_ip = 0

# Kept unchanged for other programs (default 0).
reserved = 0

# Users are confined to their home folders (0 or 1, default 0).
user_chroot = 0

# Anonymous login is allowed (0 or 1, default 0).
anonymous = 0

# Anonymous users are confined to one share (0 or 1, default 0).
anonymous_chroot = 0

# Share that anonymous users are confined to (the name of a share, default none).
anonymous_chroot_share = ""

# The server's umask applies to uploads (0 or 1, default 1).
umask = 1
)";

constexpr const char* goldenSftp =
    R"(# SFTP settings of this server. This file is rewritten whenever a setting is changed. An edit made here
# takes effect when the service starts next.
version = 1

# SFTP is enabled (0 or 1, default 0).
enabled = 0

# Port of SFTP (1 to 65535, default 22).
port = 22
)";

std::string format(const FtpSettings& settings) {
    return formatSettings(ftpSettingsFile(), settings);
}

template<class Settings> Result<Settings> parse(const SettingsFile<Settings>& form, const std::string& text) {
    Result<StrictFile> file = StrictFile::parse("x.conf", text, {form.version});
    if (!file)
        return file.error();
    return readSettings(form, *file);
}

Result<FtpSettings> parse(const std::string& text) {
    return parse(ftpSettingsFile(), text);
}

std::string replaced(std::string text, const std::string& from, const std::string& to) {
    const auto at = text.find(from);
    EXPECT_NE(at, std::string::npos) << from;
    return at == std::string::npos ? text : text.replace(at, from.size(), to);
}

std::string problemOf(const std::string& text) {
    const auto settings = parse(text);
    return settings ? "" : settings.error().message;
}

bool isSameRecord(const _tag_VELT_FTP_CONF_& a, const _tag_VELT_FTP_CONF_& b) {
    return std::memcmp(&a, &b, sizeof(a)) == 0;
}

TEST(SettingsFiles, TheDefaultsAsText) {
    EXPECT_EQ(format(defaultFtpSettings()), goldenFtp);
    EXPECT_EQ(formatSettings(sftpSettingsFile(), defaultSftpSettings()), goldenSftp);
}

TEST(SettingsFiles, ValuesAsText) {
    FtpSettings settings = defaultFtpSettings();
    std::strcpy(settings.record.anonymous_chroot_share, "Bücher \"alt\"\nport = 1");
    settings.record.service_flags = -2147483647 - 1;
    settings.record.reserved = 2147483647;
    settings.useUtf8 = false;
    const std::string text = format(settings);

    EXPECT_NE(text.find("\nanonymous_chroot_share = \"Bücher \\\"alt\\\"\\x0aport = 1\"\n"),
              std::string::npos);
    EXPECT_NE(text.find("\nservice_flags = -2147483648\n"), std::string::npos);
    EXPECT_NE(text.find("\nreserved = 2147483647\n"), std::string::npos);
    EXPECT_NE(text.find("\nuse_utf8 = 0\n"), std::string::npos);
}

TEST(SettingsFiles, BytesBehindTheEndOfATextAreKept) {
    FtpSettings settings = defaultFtpSettings();
    std::memcpy(settings.record.portnum, "21\0001\0\0\0", 8);
    const std::string text = format(settings);

    EXPECT_NE(text.find("\nport = \"21\\x001\"\n"), std::string::npos);
    const auto read = parse(text);
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

        const auto read = parse(format(settings));
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
    const auto read = parse(sftpSettingsFile(), "port=2022\r\n\t# mine\r\n   enabled\t =  1 \r\nversion=1");
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
                  "Cannot read x.conf: missing key \"" + key + "\".");
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
        {"timeout = 300", "timeout = 3oo", "line 9: timeout: expected a number from 0 to 86400"},
        {"timeout = 300", "timeout =", "line 9: timeout: expected a number from 0 to 86400"},
        {"timeout = 300", "timeout = 2147483648", "line 9: timeout: expected a number from 0 to 86400"},
        {"timeout = 300", "timeout = +1", "line 9: timeout: expected a number from 0 to 86400"},
        {"timeout = 300", "timeout 300", "line 9: expected \"key = value\""},
        {"timeout = 300", "= 300", "line 9: expected \"key = value\""},
        {"timeout = 300", "timeout = 300\ntime_out = 3", "line 10: unknown key \"time_out\""},
        {"timeout = 300", "timeout = 300\ntimeout = 3", "line 10: duplicate key \"timeout\""},
        {"umask = 1", "umask = yes", "line 66: umask: expected 0 or 1"},
        {"umask = 1", "umask = 2", "line 66: umask: expected 0 or 1"},
        {"port = \"21\"", "port = 21", "line 12: port: expected a text in double quotes"},
        {"port = \"21\"", "port = \"123456789\"", "line 12: port: expected at most 8 bytes"},
        {"version = 1", "version = 2",
         "line 3: version 2 is newer than this program, which knows files up to version 1"},
        {"version = 1", "version = 0", "line 3: version: expected 1"},
    };
    for (const auto& one : cases)
        EXPECT_EQ(problemOf(replaced(goldenFtp, one.from, one.to)),
                  std::string("Cannot read x.conf, ") + one.problem + ".");
}

TEST(SettingsFiles, AnEmptyOrOverwrittenFileIsDamaged) {
    EXPECT_EQ(problemOf(""), "Cannot read x.conf: missing key \"version\".");
    EXPECT_EQ(problemOf(std::string(4096, '\0')), "Cannot read x.conf, line 1: expected \"key = value\".");
    EXPECT_EQ(problemOf("\x7f"
                        "ELF\x02\x01"),
              "Cannot read x.conf, line 1: expected \"key = value\".");
}

TEST(SettingsFiles, ANewerVersionIsRefusedWhateverElseItHolds) {
    EXPECT_EQ(problemOf("version = 7\nport = 21\nsomething_new = {}\n"),
              "Cannot read x.conf, line 1: version 7 is newer than this program, which knows files up to "
              "version 1.");
}

TEST(SettingsFiles, EveryTruncationIsRefused) {
    const std::string golden = goldenFtp;
    // Without the last line end the last value is still whole.
    for (std::size_t length = 0; length < golden.size() - 1; ++length)
        ASSERT_FALSE(parse(golden.substr(0, length))) << length;
}

} // namespace
} // namespace velt
