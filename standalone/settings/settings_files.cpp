#include "standalone/settings/settings_files.h"

#include "base/number_text.h"
#include "schema/setting_text.h"
#include "standalone/core/quoted_text.h"

#include <algorithm>
#include <limits>

namespace velt {

namespace {

using schema::Setting;
using schema::SettingType;

constexpr const char* header =
    " settings of this server. This file is rewritten whenever a setting is changed. An edit made here\n"
    "# takes effect when the service starts next.\n";

std::string defaultText(const Setting& setting) {
    return setting.type == SettingType::number ? std::to_string(setting.number) : setting.text;
}

void assign(std::span<char> field, const std::string& text) {
    std::fill(std::copy(text.begin(), text.end(), field.begin()), field.end(), '\0');
}

void setDefault(std::int32_t& field, const Setting& setting) {
    field = static_cast<std::int32_t>(setting.number);
}

void setDefault(bool& field, const Setting& setting) {
    field = setting.number != 0;
}

void setDefault(std::span<char> field, const Setting& setting) {
    assign(field, defaultText(setting));
}

std::string valueText(std::int32_t number) {
    return std::to_string(number);
}

std::string valueText(bool on) {
    return on ? "1" : "0";
}

// All bytes of the field, those behind the text's end too: a record that is stored and read is the same
// record.
std::string valueText(std::span<char> field) {
    const std::string_view bytes(field.data(), field.size());
    return quotedText(bytes.substr(0, bytes.find_last_not_of('\0') + 1));
}

// A number out of the setting's range is read, too: it can be seen then, and replaced by one that a daemon
// takes.
void readValue(StrictFile& file, const Setting& setting, std::int32_t& field) {
    using Limits = std::numeric_limits<std::int32_t>;
    const auto text = file.value(setting.fileKey, setting.since);
    const auto number = text ? parseNumber(*text) : setting.number;
    if (number && *number >= Limits::min() && *number <= Limits::max())
        field = static_cast<std::int32_t>(*number);
    else
        file.refuse(setting.fileKey, schema::expectation(setting, schema::zeroOne));
}

void readValue(StrictFile& file, const Setting& setting, bool& field) {
    field = file.boolean(setting.fileKey, setting.number != 0, setting.since);
}

void readValue(StrictFile& file, const Setting& setting, std::span<char> field) {
    assign(field, file.text(setting.fileKey, field.size(), defaultText(setting), setting.since));
}

template<class Settings, class Act>
void withField(const StoredSetting<Settings>& stored, Settings& settings, Act act) {
    std::visit([&](const auto& field) { act(field(settings)); }, stored.field);
}

} // namespace

template<class Settings> Settings defaultSettings(const SettingsFile<Settings>& form) {
    Settings settings;
    for (const auto& stored : form.settings)
        withField(stored, settings, [&](auto&& field) { setDefault(field, *stored.setting); });
    return settings;
}

template<class Settings> std::string formatSettings(const SettingsFile<Settings>& form, Settings settings) {
    std::string text =
        std::string("# ") + form.services + header + "version = " + std::to_string(form.version) + "\n";
    for (const auto& stored : form.settings) {
        const Setting& setting = *stored.setting;
        text += std::string("\n# ") + setting.meaning + " (" + schema::valueFacts(setting, schema::zeroOne) +
                ").\n";
        withField(stored, settings, [&](auto&& field) {
            text += std::string(setting.fileKey) + " = " + valueText(field) + "\n";
        });
    }
    return text;
}

template<class Settings> Result<Settings> readSettings(const SettingsFile<Settings>& form, StrictFile& file) {
    Settings settings;
    for (const auto& stored : form.settings)
        withField(stored, settings, [&](auto&& field) { readValue(file, *stored.setting, field); });
    VELT_RETURN_IF_ERROR(file.finish());
    return settings;
}

template FtpSettings defaultSettings(const SettingsFile<FtpSettings>&);
template SftpSettings defaultSettings(const SettingsFile<SftpSettings>&);
template std::string formatSettings(const SettingsFile<FtpSettings>&, FtpSettings);
template std::string formatSettings(const SettingsFile<SftpSettings>&, SftpSettings);
template Result<FtpSettings> readSettings(const SettingsFile<FtpSettings>&, StrictFile&);
template Result<SftpSettings> readSettings(const SettingsFile<SftpSettings>&, StrictFile&);

} // namespace velt
