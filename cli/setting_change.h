// A setting whose value changes, as it is reported.
#ifndef VELT_CLI_SETTING_CHANGE_H
#define VELT_CLI_SETTING_CHANGE_H

#include <json/value.h>

#include <string>

namespace velt::cli {

struct SettingChange {
    std::string key;
    Json::Value from;
    Json::Value to;
};

/// As {"key", "from", "to"}.
Json::Value changeToJson(const SettingChange& change);

/// As "key: from -> to", printable.
std::string changeToText(const SettingChange& change);

} // namespace velt::cli

#endif
