// Which field of the settings holds the value of a key in their file.
#ifndef VELT_STANDALONE_SETTINGS_SETTINGS_FIELDS_H
#define VELT_STANDALONE_SETTINGS_SETTINGS_FIELDS_H

#include "schema/settings_table.h"
#include "standalone/settings/settings.h"

#include <cstdint>
#include <span>
#include <variant>
#include <vector>

namespace velt {

/// The place of a value: a number, a boolean, or a text with zeros behind it.
template<class Settings>
using SettingField =
    std::variant<std::int32_t& (*)(Settings&), bool& (*)(Settings&), std::span<char> (*)(Settings&)>;

template<class Settings> struct StoredSetting {
    const schema::Setting* setting;
    SettingField<Settings> field;
};

/// One kind of settings file.
template<class Settings> struct SettingsFile {
    const char* services = ""; ///< whose settings they are: "FTP", "SFTP"
    std::vector<StoredSetting<Settings>> settings;
    int version = 1; ///< the newest in which a key came
};

const SettingsFile<FtpSettings>& ftpSettingsFile();
const SettingsFile<SftpSettings>& sftpSettingsFile();

} // namespace velt

#endif
