#include "standalone/settings/settings_files.h"

#include "standalone/core/quoted_text.h"
#include "standalone/core/strict_file.h"

#include <algorithm>
#include <array>
#include <cstdint>
#include <limits>
#include <span>

namespace velt {

namespace {

constexpr std::string_view header =
    " settings of this server. The file is written anew whenever the administration changes a\n"
    "# setting; a change made here by hand takes effect when the service is started the next time.\n";

// The record's numbers, with what an administrator who opens the file wants to know about each.
struct RecordNumber {
    const char* key;
    std::int32_t _tag_VELT_FTP_CONF_::*field;
    const char* comment;
};

using Record = _tag_VELT_FTP_CONF_;

constexpr std::array recordNumbers{
    RecordNumber{"service_flags", &Record::service_flags, "Services that are on: 1 FTP, 2 FTPS, 3 both."},
    RecordNumber{"passive_port_min", &Record::passive_port_min,
                 "Ports for passive transfers; 0 and 0: the default range, 55536 to 55899."},
    RecordNumber{"passive_port_max", &Record::passive_port_max, nullptr},
    RecordNumber{"use_ext_ip", &Record::use_ext_ip,
                 "Passive mode announces the address ftp_ext_ip of veltinfo.conf."},
    RecordNumber{
        "enable_flow_ctrl", &Record::enable_flow_ctrl,
        "Limits for each session, in KB/s of 1024 bytes; 0: no limit. In force while enable_flow_ctrl "
        "is 1."},
    RecordNumber{"maxuploadrate", &Record::maxuploadrate, nullptr},
    RecordNumber{"maxdownloadrate", &Record::maxdownloadrate, nullptr},
    RecordNumber{"max_conn_per_ip", &Record::max_conn_per_ip, "Connections from one address; 0: no limit."},
    RecordNumber{"enable_fxp", &Record::enable_fxp, "Transfers from server to server."},
    RecordNumber{"support_utf8", &Record::support_utf8,
                 "File names in UTF-8: support_utf8 offers it, use_utf8 uses it from the start."},
};

constexpr std::array securityNumbers{
    RecordNumber{"anonymous", &Record::anonymous, "Anonymous login, and the share that it is confined to."},
    RecordNumber{"anonymous_chroot", &Record::anonymous_chroot, nullptr},
    RecordNumber{"user_chroot", &Record::user_chroot, "Users are confined to their home folders."},
    RecordNumber{"reserved", &Record::reserved, "Kept for programs that use it."},
};

struct Switch {
    const char* key;
    bool FtpSettings::*field;
    const char* comment;
};

constexpr std::array switches{
    Switch{"use_utf8", &FtpSettings::useUtf8, nullptr},
    Switch{"fips", &FtpSettings::fipsOnly, "FIPS-approved algorithms only."},
    Switch{"ascii", &FtpSettings::ascii, "ASCII transfers convert line ends."},
    Switch{"umask", &FtpSettings::umask, "Uploads get the server's umask."},
};

void append(std::string& text, const char* comment, std::string_view key, std::string_view value) {
    if (comment != nullptr)
        text.append("\n# ").append(comment).append("\n");
    text.append(key).append(" = ").append(value).append("\n");
}

// All bytes of the field, those behind the text's end too: a record that is stored and read is the same
// record.
std::string fieldText(std::span<const char> field) {
    std::string_view bytes(field.data(), field.size());
    const auto last = bytes.find_last_not_of('\0');
    return quotedText(bytes.substr(0, last == std::string_view::npos ? 0 : last + 1));
}

std::int32_t readNumber(StrictFile& file, const char* key) {
    using Limits = std::numeric_limits<std::int32_t>;
    return static_cast<std::int32_t>(file.number(key, Limits::min(), Limits::max(), 0));
}

void readField(StrictFile& file, const char* key, std::span<char> field) {
    const std::string text = file.text(key, field.size(), "");
    std::fill(std::copy(text.begin(), text.end(), field.begin()), field.end(), '\0');
}

std::string settingsHeader(std::string_view service) {
    return std::string("# ").append(service).append(header).append("version = 1\n");
}

} // namespace

std::string formatFtpSettings(const FtpSettings& settings) {
    const Record& record = settings.record;
    std::string text = settingsHeader("FTP and FTPS");
    append(text, "The control port.", "port", fieldText(record.portnum));
    for (const RecordNumber& number : recordNumbers)
        append(text, number.comment, number.key, std::to_string(record.*number.field));
    for (const Switch& item : switches)
        append(text, item.comment, item.key, settings.*item.field ? "1" : "0");
    append(text, "An idle session ends after so many seconds; 0: never.", "timeout",
           std::to_string(settings.timeout));
    for (const RecordNumber& number : securityNumbers) {
        append(text, number.comment, number.key, std::to_string(record.*number.field));
        if (number.field == &Record::anonymous_chroot)
            append(text, nullptr, "anonymous_chroot_share", fieldText(record.anonymous_chroot_share));
    }
    return text;
}

Result<FtpSettings> parseFtpSettings(const std::string& name, std::string_view contents) {
    Result<StrictFile> file = StrictFile::parse(name, contents);
    if (!file)
        return file.error();
    FtpSettings settings;
    readField(*file, "port", settings.record.portnum);
    readField(*file, "anonymous_chroot_share", settings.record.anonymous_chroot_share);
    for (const RecordNumber& number : recordNumbers)
        settings.record.*number.field = readNumber(*file, number.key);
    for (const RecordNumber& number : securityNumbers)
        settings.record.*number.field = readNumber(*file, number.key);
    for (const Switch& item : switches)
        settings.*item.field = file->boolean(item.key, settings.*item.field);
    settings.timeout = readNumber(*file, "timeout");
    if (Result<> done = file->finish(); !done)
        return done.error();
    return settings;
}

std::string formatSftpSettings(const SftpSettings& settings) {
    std::string text = settingsHeader("SFTP");
    append(text, "The service is on.", "enabled", settings.enabled ? "1" : "0");
    append(text, "Its port.", "port", std::to_string(settings.port));
    return text;
}

Result<SftpSettings> parseSftpSettings(const std::string& name, std::string_view contents) {
    Result<StrictFile> file = StrictFile::parse(name, contents);
    if (!file)
        return file.error();
    SftpSettings settings;
    settings.enabled = file->boolean("enabled", settings.enabled);
    settings.port = readNumber(*file, "port");
    if (Result<> done = file->finish(); !done)
        return done.error();
    return settings;
}

} // namespace velt
