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

/// The current values: an object. Throws Failure when the answer is none, or lacks a required key.
Json::Value readSettings(ApiClient& api, const SettingGroup& group);

/// Writes the settings.
void showSettings(Context& context, const SettingGroup& group);

/// Changes the settings that words of the form key=value name and writes what is different afterwards. A
/// value that the server accepted but does not show is told on the error output.
void changeSettings(Context& context, const SettingGroup& group, const std::vector<std::string>& words);

/// As {"key", "from", "to"}.
Json::Value changeToJson(const Change& change);

/// As "key: from -> to", printable.
std::string changeToText(const Change& change);

} // namespace velt::cli

#endif
