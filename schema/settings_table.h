// The settings of the services: every fact about each, once. The settings files, the command line and the
// checks follow from these tables; the description of the API says the same, which a test holds.
#ifndef VELT_SCHEMA_SETTINGS_TABLE_H
#define VELT_SCHEMA_SETTINGS_TABLE_H

#include <cstdint>
#include <span>
#include <string_view>

namespace velt::schema {

enum class SettingType {
    boolean,
    number,
    text,
};

inline constexpr int highestPort = 65535;
inline constexpr int firstPassivePort = 55536; ///< of the default range
inline constexpr int lastPassivePort = 55899;
inline constexpr const char* passiveRange = "55536:55899"; ///< the same, as a text
inline constexpr std::int64_t highestNumber = INT32_MAX;
inline constexpr std::int64_t lowestNumber = INT32_MIN;

constexpr bool isRange(std::string_view text, int first, int last) {
    int ends[2] = {};
    std::size_t end = 0;
    for (const char c : text) {
        if (c == ':')
            ++end;
        else
            ends[end] = ends[end] * 10 + (c - '0');
    }
    return ends[0] == first && ends[1] == last;
}
static_assert(isRange(passiveRange, firstPassivePort, lastPassivePort));

/// What becomes of a number outside a setting's range.
enum class OutOfRange {
    refused,
    acceptedAbove, ///< refused below the range
    accepted,      ///< without effect
};

/// One setting, as the API and the command line show it, as its file stores it, or both.
struct Setting {
    const char* key = nullptr;     ///< in the API and on the command line; null: not served
    const char* fileKey = nullptr; ///< in the settings file; null: not stored there, or under other keys
    SettingType type = SettingType::boolean;
    const char* meaning = "";          ///< a sentence without a full stop
    const char* unit = nullptr;        ///< of a number
    std::int64_t least = 0;            ///< of a number; lowestNumber: any
    std::int64_t most = highestNumber; ///< highestNumber: any
    OutOfRange outOfRange = OutOfRange::refused;
    std::int64_t number = 0;       ///< the default of a number; of a boolean 0 or 1
    const char* text = "";         ///< the default of a text
    const char* form = "a text";   ///< what a text looks like
    int since = 1;                 ///< the version of the settings file in which the key came
    int apiVersion = 0;            ///< the only version of the API that has the key; 0: each has it
    const char* service = nullptr; ///< the service that a boolean switches on and off
};

/// Whether the setting can have the number.
constexpr bool accepts(const Setting& setting, std::int64_t number) {
    if (setting.outOfRange == OutOfRange::accepted)
        return true;
    return number >= setting.least &&
           (number <= setting.most || setting.outOfRange == OutOfRange::acceptedAbove);
}

inline constexpr Setting ftpSettings[] = {
    {.key = "enable_ftp", .meaning = "FTP is enabled", .service = "ftp"},
    {.key = "enable_ftps", .meaning = "FTPS is enabled", .service = "ftps"},
    {.fileKey = "service_flags",
     .type = SettingType::number,
     .meaning = "Enabled services: 0 none, 1 FTP, 2 FTPS, 3 both",
     .least = lowestNumber},
    {.key = "timeout",
     .fileKey = "timeout",
     .type = SettingType::number,
     .meaning = "Idle time after which a session ends; 0 means never",
     .unit = "seconds",
     .most = 86400,
     .outOfRange = OutOfRange::acceptedAbove,
     .number = 300},
    {.key = "portnum",
     .fileKey = "port",
     .type = SettingType::number,
     .meaning = "Port of FTP and FTPS",
     .least = 1,
     .most = highestPort,
     .number = 21},
    {.key = "custom_port_range", .meaning = "Passive transfers use custom_port, not the default range"},
    {.key = "custom_port",
     .type = SettingType::text,
     .meaning = "Ports for passive transfers",
     .text = passiveRange,
     .form = "first and last port, such as 55536:55899"},
    {.fileKey = "passive_port_min",
     .type = SettingType::number,
     .meaning = "First port for passive transfers; 0 means the default range",
     .most = highestPort,
     .outOfRange = OutOfRange::accepted},
    {.fileKey = "passive_port_max",
     .type = SettingType::number,
     .meaning = "Last port for passive transfers; 0 means the default range",
     .most = highestPort,
     .outOfRange = OutOfRange::accepted},
    {.key = "use_ext_ip", .fileKey = "use_ext_ip", .meaning = "Passive mode announces the external address"},
    {.key = "ext_ip",
     .type = SettingType::text,
     .meaning = "External address",
     .form = "an IPv4 address such as 192.0.2.1"},
    {.key = "enable_utf8",
     .fileKey = "support_utf8",
     .meaning = "File names may be in UTF-8",
     .number = 1,
     .apiVersion = 1},
    {.key = "use_utf8",
     .fileKey = "use_utf8",
     .meaning = "File names are in UTF-8 from the start",
     .number = 1,
     .apiVersion = 2},
    {.key = "utf8_mode",
     .type = SettingType::number,
     .meaning = "File names in UTF-8: 0 never, 1 when the client asks, 2 from the start",
     .most = 2,
     .number = 2,
     .apiVersion = 3},
    {.key = "enable_fxp", .fileKey = "enable_fxp", .meaning = "Transfers between two servers are allowed"},
    {.key = "enable_ascii", .fileKey = "ascii", .meaning = "ASCII transfers convert line ends"},
    {.key = "enable_fips", .fileKey = "fips", .meaning = "Only algorithms approved by FIPS are used"},
    {.key = "enable_flow_ctrl",
     .fileKey = "enable_flow_ctrl",
     .meaning = "The limits maxuploadrate and maxdownloadrate are in force"},
    {.key = "maxuploadrate",
     .fileKey = "maxuploadrate",
     .type = SettingType::number,
     .meaning = "Upload limit of a session; 0 means no limit",
     .unit = "KB/s of 1024 bytes",
     .outOfRange = OutOfRange::accepted},
    {.key = "maxdownloadrate",
     .fileKey = "maxdownloadrate",
     .type = SettingType::number,
     .meaning = "Download limit of a session; 0 means no limit",
     .unit = "KB/s of 1024 bytes",
     .outOfRange = OutOfRange::accepted},
    {.key = "max_conn_per_ip",
     .fileKey = "max_conn_per_ip",
     .type = SettingType::number,
     .meaning = "Connections from one client address; 0 means no limit",
     .outOfRange = OutOfRange::accepted},
    {.fileKey = "reserved",
     .type = SettingType::number,
     .meaning = "Kept unchanged for other programs",
     .least = lowestNumber},
};

inline constexpr Setting securitySettings[] = {
    {.key = "user_chroot", .fileKey = "user_chroot", .meaning = "Users are confined to their home folders"},
    {.key = "anonymous", .fileKey = "anonymous", .meaning = "Anonymous login is allowed"},
    {.key = "anonymous_chroot",
     .fileKey = "anonymous_chroot",
     .meaning = "Anonymous users are confined to one share"},
    {.key = "anonymous_chroot_share",
     .fileKey = "anonymous_chroot_share",
     .type = SettingType::text,
     .meaning = "Share that anonymous users are confined to",
     .form = "the name of a share"},
    {.key = "enable_umask",
     .fileKey = "umask",
     .meaning = "The server's umask applies to uploads",
     .number = 1},
};

inline constexpr Setting sftpSettings[] = {
    {.key = "enable", .fileKey = "enabled", .meaning = "SFTP is enabled", .service = "sftp"},
    {.key = "portnum",
     .fileKey = "port",
     .type = SettingType::number,
     .meaning = "Port of SFTP",
     .least = 1,
     .most = highestPort,
     .number = 22},
};

inline constexpr Setting confinementSettings[] = {
    {.key = "sftp",
     .fileKey = "sftp",
     .meaning = "A login over SFTP sees what the same login over FTP sees",
     .number = 1},
};

/// The settings behind one API, or those of the platform that have none.
struct SettingGroup {
    const char* name;     ///< on the command line
    const char* title;    ///< what the settings are, for people
    const char* api;      ///< "" for the platform's
    int newestApiVersion; ///< 0 for the platform's
    std::span<const Setting> settings;

    constexpr bool isPlatforms() const { return newestApiVersion == 0; }
};

inline constexpr SettingGroup ftp{"ftp", "the FTP and FTPS settings", "VELT.Core.FileServ.FTP", 3,
                                  ftpSettings};
inline constexpr SettingGroup security{"security", "the security settings of FTP",
                                       "VELT.Core.FileServ.FTP.Security", 1, securitySettings};
inline constexpr SettingGroup sftp{"sftp", "the SFTP settings", "VELT.Core.FileServ.FTP.SFTP", 1,
                                   sftpSettings};
inline constexpr SettingGroup confinement{"confinement", "which services confine their users, beside FTP", "",
                                          0, confinementSettings};

/// In the order in which people are shown them.
inline constexpr const SettingGroup* groups[] = {&ftp, &security, &sftp, &confinement};

} // namespace velt::schema

#endif
