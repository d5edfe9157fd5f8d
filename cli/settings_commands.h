// Reading settings and changing some of them: ftp, security and sftp.
#ifndef VELT_CLI_SETTINGS_COMMANDS_H
#define VELT_CLI_SETTINGS_COMMANDS_H

#include "cli/command.h"
#include "cli/setting.h"

namespace velt::cli {

/// A setting whose value changes.
struct Change {
    std::string key;
    Json::Value from;
    Json::Value to;
};

/// The current values: an object. Failure when the answer is not an object or lacks a required key.
Json::Value readSettings(ApiClient& api, const SettingGroup& group);

/// Writes the settings.
void showSettings(Context& context, const SettingGroup& group);

/// Changes the settings that words such as "portnum=2121" name, and writes what is different afterwards. When
/// the server accepts a value but does not show it, a warning goes to the error output.
void changeSettings(Context& context, const SettingGroup& group, const std::vector<std::string>& words);

/// As {"key", "from", "to"}.
Json::Value changeToJson(const Change& change);

/// As "key: from -> to", printable.
std::string changeToText(const Change& change);

} // namespace velt::cli

#endif
