#include "host/api/parameter_check.h"

#include "base/text.h"
#include "schema/settings_table.h"

#include <algorithm>
#include <string_view>

namespace velt::host {
namespace {

bool contains(const std::string& text, bool (*wanted)(char)) {
    return std::ranges::any_of(text, wanted);
}

bool isNul(char byte) {
    return byte == '\0';
}

std::optional<FieldError> findNul(const Json::Value& value, const std::string& field) {
    if (value.isString() && contains(value.asString(), isNul)) {
        return FieldError{field, "a text without the character U+0000"};
    }
    if (value.isArray()) {
        for (Json::ArrayIndex i = 0; i < value.size(); i++) {
            if (auto found = findNul(value[i], field + "[" + std::to_string(i) + "]")) {
                return found;
            }
        }
    } else if (value.isObject()) {
        const std::string prefix = field.empty() ? "" : field + '.';
        for (const std::string& name : value.getMemberNames()) {
            if (auto found = findNul(value[name], prefix + name)) {
                return found;
            }
        }
    }
    return std::nullopt;
}

bool isTextSetting(const Row& row, std::string_view key) {
    return std::ranges::any_of(schema::groups, [&](const schema::SettingGroup* group) {
        return group->api == row.api &&
               std::ranges::any_of(group->settings, [&](const schema::Setting& setting) {
                   return setting.type == schema::SettingType::text && setting.key != nullptr &&
                          setting.key == key;
               });
    });
}

std::optional<FieldError> findUnfitRule(const Json::Value& rules) {
    for (Json::ArrayIndex i = 0; rules.isArray() && i < rules.size(); i++) {
        if (!rules[i].isObject()) {
            return FieldError{"rules[" + std::to_string(i) + "]", "an object"};
        }
    }
    return std::nullopt;
}

} // namespace

std::optional<FieldError> findUnfitParameter(const Row& row, const Json::Value& parameters) {
    if (auto found = findNul(parameters, "")) {
        return found;
    }
    if (auto found = findUnfitRule(parameters["rules"])) {
        return found;
    }
    for (const std::string& name : parameters.getMemberNames()) {
        const Json::Value& value = parameters[name];
        if (value.isString() && contains(value.asString(), isControl) && isTextSetting(row, name)) {
            return FieldError{name, "a text without control characters"};
        }
    }
    return std::nullopt;
}

} // namespace velt::host
