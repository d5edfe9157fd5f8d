#include "base/ipv4.h"
#include "base/number_text.h"
#include "schema/setting_text.h"
#include "standalone/core/error_number.h"
#include "standalone/core/quoted_text.h"
#include "standalone/settings/settings_fields.h"

namespace velt {

namespace {

using schema::Setting;
using schema::SettingType;

constexpr int lowestPassivePort = 1024;

Error refuse(std::string sentence, SourcePlace where = SourcePlace::current()) {
    return {ErrorNumber::invalid, std::move(sentence), where};
}

std::string nameOf(const char* services, const Setting& setting) {
    return std::string("The ") + services + " setting " +
           (setting.key != nullptr ? setting.key : setting.fileKey);
}

Error refuseValue(const char* services, const Setting& setting, const std::string& value) {
    return refuse(nameOf(services, setting) + " is " + value + "; expected " +
                  schema::expectation(setting, schema::zeroOne) + ".");
}

Result<> checkValue(const char* services, const Setting& setting, std::int32_t number) {
    if (setting.type == SettingType::number && !schema::accepts(setting, number))
        return refuseValue(services, setting, std::to_string(number));
    return {};
}

Result<> checkValue(const char* /*services*/, const Setting& /*setting*/, bool /*on*/) {
    return {};
}

Result<> checkValue(const char* services, const Setting& setting, std::span<char> field) {
    const std::string_view bytes(field.data(), field.size());
    const std::string_view text = bytes.substr(0, bytes.find('\0'));
    if (text.size() == bytes.size())
        return refuse(nameOf(services, setting) + " is longer than " + std::to_string(field.size() - 1) +
                      " bytes.");
    if (setting.type != SettingType::number)
        return {};
    const auto number = parseNumber(text);
    if (!number || std::to_string(*number) != text || !schema::accepts(setting, *number))
        return refuseValue(services, setting, quotedText(text));
    return {};
}

template<class Settings> Result<> checkValues(const SettingsFile<Settings>& form, Settings settings) {
    for (const auto& stored : form.settings) {
        const auto check = [&](const auto& field) {
            return checkValue(form.services, *stored.setting, field(settings));
        };
        VELT_RETURN_IF_ERROR(std::visit(check, stored.field));
    }
    return {};
}

std::string rangeText(const VELT_FTP_PORT_RANGE& range) {
    return std::to_string(range.first) + " to " + std::to_string(range.last);
}

Result<> checkPassiveRange(const _tag_VELT_FTP_CONF_& record) {
    const VELT_FTP_PORT_RANGE range = passiveRange(record);
    if (range.first < lowestPassivePort || range.first > schema::highestPort ||
        range.last < lowestPassivePort || range.last > schema::highestPort)
        return refuse("The passive port range is " + rangeText(range) + "; expected ports from " +
                      std::to_string(lowestPassivePort) + " to " + std::to_string(schema::highestPort) + ".");
    if (range.first > range.last)
        return refuse("The passive port range is " + rangeText(range) +
                      "; its first port has to be lower than its last.");
    if (range.first == range.last)
        return refuse("The passive port range has only the port " + std::to_string(range.first) +
                      "; the FTP daemon needs two ports or more.");
    const int port = controlPort(record);
    if (port >= range.first && port <= range.last)
        return refuse("The passive port range " + rangeText(range) + " contains the FTP port " +
                      std::to_string(port) + "; choose a range without it.");
    return {};
}

} // namespace

Result<> checkFtpSettings(const FtpSettings& settings) {
    VELT_RETURN_IF_ERROR(checkValues(ftpSettingsFile(), settings));
    VELT_RETURN_IF_ERROR(checkPassiveRange(settings.record));
    if (!settings.externalAddress.empty() && !parseIPv4(settings.externalAddress))
        return refuse("The external address is " + quotedText(settings.externalAddress) +
                      "; expected an IPv4 address such as 192.0.2.1, or nothing.");
    return {};
}

Result<> checkSftpSettings(const SftpSettings& settings) {
    return checkValues(sftpSettingsFile(), settings);
}

Result<> checkExternalAddress(const std::string& address) {
    const auto parsed = parseIPv4(address);
    const char* const kind = parsed ? unreachableKindOf(*parsed) : nullptr;
    if (kind != nullptr)
        return refuse("The external address (ext_ip) is " + address + ", " + kind +
                      "; expected the address at which clients reach this server.");
    return {};
}

} // namespace velt
