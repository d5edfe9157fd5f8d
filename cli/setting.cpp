#include "cli/setting.h"

#include "base/number_text.h"
#include "base/text.h"
#include "cli/failure.h"
#include "schema/setting_text.h"

#include <algorithm>
#include <iterator>

namespace velt::cli {

namespace {

Json::Value parseBoolean(const std::string& word) {
    const std::string lower = lowerCase(word);
    if (lower == "true" || lower == "on" || lower == "yes") {
        return true;
    }
    if (lower == "false" || lower == "off" || lower == "no") {
        return false;
    }
    return {};
}

// Null when the word is not a value of the type.
Json::Value parseValue(const std::string& word, SettingType type) {
    switch (type) {
    case SettingType::boolean:
        return parseBoolean(word);
    case SettingType::number: {
        const auto number = parseNumber(word);
        return number ? Json::Value(Json::Int64(*number)) : Json::Value();
    }
    case SettingType::text:
        break;
    }
    return word;
}

std::string seeHelp(const SettingGroup& group) {
    return std::string("Run 'veltctl ") + group.command + " set --help' for all settings.";
}

} // namespace

const Setting* SettingGroup::find(const std::string& key) const {
    const auto found = std::ranges::find(settings, key, &Setting::key);
    return found == settings.end() ? nullptr : &*found;
}

std::string SettingGroup::keys() const {
    std::string list;
    for (const Setting& setting : settings) {
        list += (list.empty() ? "" : ", ") + std::string(setting.key);
    }
    return list;
}

SettingGroup groupOf(const schema::SettingGroup& table, int version) {
    SettingGroup group{table.name, table.api, version, {}};
    std::ranges::copy_if(
        table.settings, std::back_inserter(group.settings), [version](const Setting& setting) {
            return setting.key != nullptr && (setting.apiVersion == 0 || setting.apiVersion == version);
        });
    return group;
}

SettingGroup newestGroupOf(const schema::SettingGroup& table) {
    return groupOf(table, table.newestApiVersion);
}

bool hasType(const Json::Value& value, SettingType type) {
    switch (type) {
    case SettingType::boolean:
        return value.isBool();
    case SettingType::number:
        return value.isInt();
    case SettingType::text:
        break;
    }
    return value.isString();
}

bool isValid(const Json::Value& value, const Setting& setting) {
    if (!hasType(value, setting.type)) {
        return false;
    }
    return setting.type != SettingType::number ||
           (setting.least <= value.asInt64() && value.asInt64() <= setting.most);
}

std::string expectationOf(const Setting& setting) {
    return setting.key + (": expected " + schema::expectation(setting, schema::onOff));
}

Json::Value parseAssignments(const SettingGroup& group, const std::vector<std::string>& words) {
    Json::Value result(Json::objectValue);
    for (const std::string& word : words) {
        const std::size_t equals = word.find('=');
        if (equals == std::string::npos) {
            throw Failure(ExitCode::usage, "Expected key=value, not \"" + word + "\".", seeHelp(group));
        }
        const std::string key = word.substr(0, equals);
        const Setting* setting = group.find(key);
        if (setting == nullptr) {
            throw Failure(ExitCode::usage,
                          std::string("Unknown ") + group.command + " setting \"" + key + "\".",
                          std::string("Known keys: ") + group.keys() + ".");
        }
        if (result.isMember(key)) {
            throw Failure(ExitCode::usage, "Duplicate key " + key + ".", "Name each key once.");
        }
        const Json::Value value = parseValue(word.substr(equals + 1), setting->type);
        if (!isValid(value, *setting)) {
            throw Failure(ExitCode::usage, expectationOf(*setting) + ".", seeHelp(group));
        }
        if (key == "custom_port" && value.asString().empty()) {
            throw Failure(ExitCode::usage, "custom_port cannot be empty.",
                          "Use FIRST:LAST, or custom_port_range=off for the default range.");
        }
        result[key] = value;
    }
    return result;
}

} // namespace velt::cli
