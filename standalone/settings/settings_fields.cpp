#include "standalone/settings/settings_fields.h"

#include <algorithm>
#include <array>
#include <string_view>

namespace velt {

namespace {

using Groups = std::span<const std::span<const schema::Setting>>;
using Record = _tag_VELT_FTP_CONF_;

template<class Settings> struct Field {
    std::string_view fileKey;
    SettingField<Settings> field;
};

template<auto member> std::int32_t& number(FtpSettings& settings) {
    return settings.record.*member;
}

template<auto member> std::span<char> text(FtpSettings& settings) {
    return settings.record.*member;
}

template<class Settings, auto member> auto& own(Settings& settings) {
    return settings.*member;
}

constexpr std::array<std::span<const schema::Setting>, 2> ftpGroups{schema::ftpSettings,
                                                                    schema::securitySettings};
constexpr std::array<Field<FtpSettings>, 21> ftpFields{{
    {"service_flags", number<&Record::service_flags>},
    {"timeout", own<FtpSettings, &FtpSettings::timeout>},
    {"port", text<&Record::portnum>},
    {"passive_port_min", number<&Record::passive_port_min>},
    {"passive_port_max", number<&Record::passive_port_max>},
    {"use_ext_ip", number<&Record::use_ext_ip>},
    {"support_utf8", number<&Record::support_utf8>},
    {"use_utf8", own<FtpSettings, &FtpSettings::useUtf8>},
    {"enable_fxp", number<&Record::enable_fxp>},
    {"ascii", own<FtpSettings, &FtpSettings::ascii>},
    {"fips", own<FtpSettings, &FtpSettings::fipsOnly>},
    {"enable_flow_ctrl", number<&Record::enable_flow_ctrl>},
    {"maxuploadrate", number<&Record::maxuploadrate>},
    {"maxdownloadrate", number<&Record::maxdownloadrate>},
    {"max_conn_per_ip", number<&Record::max_conn_per_ip>},
    {"reserved", number<&Record::reserved>},
    {"user_chroot", number<&Record::user_chroot>},
    {"anonymous", number<&Record::anonymous>},
    {"anonymous_chroot", number<&Record::anonymous_chroot>},
    {"anonymous_chroot_share", text<&Record::anonymous_chroot_share>},
    {"umask", own<FtpSettings, &FtpSettings::umask>},
}};

constexpr std::array<std::span<const schema::Setting>, 1> sftpGroups{schema::sftpSettings};
constexpr std::array<Field<SftpSettings>, 2> sftpFields{{
    {"enabled", own<SftpSettings, &SftpSettings::enabled>},
    {"port", own<SftpSettings, &SftpSettings::port>},
}};

// Whether the groups' settings that are stored, taken in order, are those that the fields name.
template<class Settings> constexpr bool isComplete(Groups groups, std::span<const Field<Settings>> fields) {
    std::size_t count = 0;
    for (const auto& group : groups)
        for (const schema::Setting& setting : group)
            if (setting.fileKey != nullptr &&
                (count == fields.size() || fields[count++].fileKey != setting.fileKey))
                return false;
    return count == fields.size();
}

static_assert(isComplete<FtpSettings>(ftpGroups, ftpFields));
static_assert(isComplete<SftpSettings>(sftpGroups, sftpFields));

template<class Settings>
SettingsFile<Settings> makeFile(const char* services, Groups groups,
                                std::span<const Field<Settings>> fields) {
    SettingsFile<Settings> file{services, {}};
    auto field = fields.begin();
    for (const auto& group : groups)
        for (const schema::Setting& setting : group)
            if (setting.fileKey != nullptr) {
                file.settings.push_back({&setting, field++->field});
                file.version = std::max(file.version, setting.since);
            }
    return file;
}

} // namespace

const SettingsFile<FtpSettings>& ftpSettingsFile() {
    static const auto file = makeFile<FtpSettings>("FTP", ftpGroups, ftpFields);
    return file;
}

const SettingsFile<SftpSettings>& sftpSettingsFile() {
    static const auto file = makeFile<SftpSettings>("SFTP", sftpGroups, sftpFields);
    return file;
}

} // namespace velt
