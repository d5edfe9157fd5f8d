// The settings that can be changed one by one.
#ifndef VELT_CLI_SETTING_H
#define VELT_CLI_SETTING_H

#include "cli/api_client.h"
#include "schema/settings_table.h"

#include <json/value.h>

#include <string>
#include <vector>

namespace velt::cli {

using schema::Setting;
using schema::SettingType;

/// The settings behind one "get" and one "set".
struct SettingGroup {
    const char* command; ///< the first word of the command: ftp, security, sftp or confinement
    const char* api;
    int version;                   ///< 0: of no module
    std::vector<Setting> settings; ///< those with a key in this version

    ApiMethod method(const char* name) const { return {api, version, name}; }
    const Setting* find(const std::string& key) const;
    std::string keys() const; ///< all keys, separated by commas
};

/// The group as a version of its API has it; the versions of FTP's differ in the key for UTF-8.
SettingGroup groupOf(const schema::SettingGroup& table, int version);
SettingGroup newestGroupOf(const schema::SettingGroup& table);

/// Whether the value has the JSON type of the setting.
bool hasType(const Json::Value& value, SettingType type);

/// Whether the setting can have the value. A text is checked by the server.
bool isValid(const Json::Value& value, const Setting& setting);

/// "timeout: expected a number from 0 to 86400".
std::string expectationOf(const Setting& setting);

/// The object that words such as "portnum=2121" name. Failure (usage) for any other word, an unknown key, a
/// key named twice, or a value that the setting cannot have.
Json::Value parseAssignments(const SettingGroup& group, const std::vector<std::string>& words);

} // namespace velt::cli

#endif
