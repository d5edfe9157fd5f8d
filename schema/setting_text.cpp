#include "schema/setting_text.h"

namespace velt::schema {

namespace {

std::string numberFacts(const Setting& setting) {
    std::string facts;
    for (const std::string& fact :
         {std::string(setting.unit == nullptr ? "" : setting.unit), rangeText(setting)})
        facts += fact.empty() ? "" : fact + ", ";
    return facts;
}

std::string numberExpectation(const Setting& setting) {
    return "a number from " + std::to_string(setting.least) + " to " + std::to_string(setting.most);
}

} // namespace

std::string rangeText(const Setting& setting) {
    if (setting.most != highestNumber)
        return std::to_string(setting.least) + " to " + std::to_string(setting.most);
    return setting.least == lowestNumber ? "" : std::to_string(setting.least) + " or more";
}

std::string expectation(const Setting& setting, BooleanWords words) {
    switch (setting.type) {
    case SettingType::boolean:
        return words.either;
    case SettingType::number:
        return numberExpectation(setting);
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
        return numberFacts(setting) + "default " + std::to_string(setting.number);
    case SettingType::text:
        break;
    }
    return setting.form + std::string(", default ") + (*setting.text == '\0' ? "none" : setting.text);
}

} // namespace velt::schema
