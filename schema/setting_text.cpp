#include "schema/setting_text.h"

#include "base/number_text.h"

namespace velt::schema {

namespace {

std::string rangeFacts(const Setting& setting) {
    const std::string unit = setting.unit == nullptr ? "" : std::string(setting.unit) + ", ";
    return unit + std::to_string(setting.least) + " to " + std::to_string(setting.most);
}

} // namespace

std::string expectation(const Setting& setting, BooleanWords words) {
    switch (setting.type) {
    case SettingType::boolean:
        return words.either;
    case SettingType::number:
        return numberText(setting.least, setting.most);
    case SettingType::text:
        break;
    }
    return setting.form;
}

std::string valueFacts(const Setting& setting, BooleanWords words) {
    switch (setting.type) {
    case SettingType::boolean:
        return words.either + std::string(", default ") + (setting.number != 0 ? words.on : words.off);
    case SettingType::number:
        return rangeFacts(setting) + ", default " + std::to_string(setting.number);
    case SettingType::text:
        break;
    }
    return setting.form + std::string(", default ") + (*setting.text == '\0' ? "none" : setting.text);
}

} // namespace velt::schema
