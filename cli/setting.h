// The settings that can be changed one by one: their keys, types and meanings.
#ifndef VELT_CLI_SETTING_H
#define VELT_CLI_SETTING_H

#include "cli/api_client.h"

#include <json/value.h>

#include <string>
#include <vector>

namespace velt::cli {

enum class SettingType {
    boolean,
    integer,
    text
};

struct Setting {
    const char* key = nullptr;
    SettingType type = SettingType::text;
    const char* meaning = nullptr;
    /// The service, as the server's status names it, that this setting switches on and off. Every change must
    /// name such a setting, changed or not.
    const char* service = nullptr;
};

/// The settings behind one "get" and one "set".
struct SettingGroup {
    const char* command; ///< the first word of the command: ftp, security or sftp
    const char* api;
    int version;
    std::vector<Setting> settings;

    ApiMethod method(const char* name) const { return {api, version, name}; }
    const Setting* find(const std::string& key) const;
    std::string keys() const; ///< all keys, separated by commas
};

inline constexpr int newestFtpVersion = 3;

/// `version` is 1, 2 or 3; they differ in the key for UTF-8.
SettingGroup ftpSettings(int version = newestFtpVersion);
SettingGroup securitySettings();
SettingGroup sftpSettings();

/// What values of the type look like, for messages.
const char* describe(SettingType type);

/// Whether the value has the JSON type of the setting.
bool hasType(const Json::Value& value, SettingType type);

/// The object that words of the form key=value name. Throws Failure (usage) for a word of another form, an
/// unknown key, a key named twice, or a value that is not of the key's type.
Json::Value parseAssignments(const SettingGroup& group, const std::vector<std::string>& words);

/// The parameters for a "set" that changes what `wanted` names: with the required keys at their current
/// values, and with the keys that the wanted ones have no effect without.
Json::Value completeChange(const SettingGroup& group, const Json::Value& wanted, const Json::Value& current);

} // namespace velt::cli

#endif
