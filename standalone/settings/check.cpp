#include "base/ipv4.h"
#include "standalone/core/error_number.h"
#include "standalone/core/quoted_text.h"
#include "standalone/settings/settings.h"

#include <charconv>
#include <cstring>

namespace velt {

namespace {

constexpr int highestPort = 65535;
constexpr int lowestPassivePort = 1024;

Error refuse(std::string sentence, SourcePlace where = SourcePlace::current()) {
    return {ErrorNumber::invalid, std::move(sentence), where};
}

std::string rangeText(const VELT_FTP_PORT_RANGE& range) {
    return std::to_string(range.first) + " to " + std::to_string(range.last);
}

Result<> checkText(const char* setting, std::string_view field) {
    if (field.find('\0') == std::string_view::npos)
        return refuse(std::string("The ") + setting + " does not end within its " +
                      std::to_string(field.size()) + " bytes.");
    return {};
}

std::string_view fieldOf(const char* bytes, std::size_t size) {
    return {bytes, size};
}

Result<> checkPort(const _tag_VELT_FTP_CONF_& record) {
    if (Result<> fits = checkText("FTP port", fieldOf(record.portnum, sizeof(record.portnum))); !fits)
        return fits;
    if (controlPort(record) == 0)
        return refuse("The FTP port is " + quotedText(record.portnum) +
                      "; it has to be a decimal number from 1 to 65535.");
    return {};
}

Result<> checkPassiveRange(const _tag_VELT_FTP_CONF_& record) {
    const VELT_FTP_PORT_RANGE range = passiveRange(record);
    if (range.first < lowestPassivePort || range.first > highestPort || range.last < lowestPassivePort ||
        range.last > highestPort)
        return refuse("The passive port range is " + rangeText(range) +
                      "; both ends have to be from 1024 to 65535.");
    if (range.first > range.last)
        return refuse("The passive port range is " + rangeText(range) +
                      "; its first port has to be lower than its last.");
    if (range.first == range.last)
        return refuse("The passive port range holds the port " + std::to_string(range.first) +
                      " only; the FTP daemon takes a range of two ports or more.");
    const int port = controlPort(record);
    if (port >= range.first && port <= range.last)
        return refuse("The passive port range " + rangeText(range) + " contains the FTP port " +
                      std::to_string(port) + "; they have to be apart.");
    return {};
}

} // namespace

int controlPort(const _tag_VELT_FTP_CONF_& record) {
    const char* begin = record.portnum;
    const char* end = begin + ::strnlen(begin, sizeof(record.portnum));
    int port = 0;
    const auto [parsed, error] = std::from_chars(begin, end, port);
    // from_chars takes leading zeros; a port has one way to be written.
    const bool plain = error == std::errc() && parsed == end && *begin != '0';
    return plain && port >= 1 && port <= highestPort ? port : 0;
}

bool enablesFtp(const _tag_VELT_FTP_CONF_& record) {
    return (record.service_flags & (VELT_FTP_SERVICE_PLAIN | VELT_FTP_SERVICE_TLS)) != 0;
}

bool hasCustomPassiveRange(const _tag_VELT_FTP_CONF_& record) {
    return record.passive_port_min != 0 && record.passive_port_max != 0;
}

VELT_FTP_PORT_RANGE passiveRange(const _tag_VELT_FTP_CONF_& record) {
    if (!hasCustomPassiveRange(record))
        return defaultPassiveRange;
    return {record.passive_port_min, record.passive_port_max};
}

Result<> checkFtpSettings(const FtpSettings& settings) {
    const _tag_VELT_FTP_CONF_& record = settings.record;
    if (Result<> port = checkPort(record); !port)
        return port;
    if (Result<> range = checkPassiveRange(record); !range)
        return range;
    const auto share = fieldOf(record.anonymous_chroot_share, sizeof(record.anonymous_chroot_share));
    if (Result<> fits = checkText("name of the anonymous share", share); !fits)
        return fits;
    if (settings.timeout < 0)
        return refuse("The FTP time-out is " + std::to_string(settings.timeout) +
                      " seconds; it has to be 0 (never) or more.");
    if (!settings.externalAddress.empty() && !parseIPv4(settings.externalAddress))
        return refuse("The external address is " + quotedText(settings.externalAddress) +
                      "; it has to be an IPv4 address such as 192.0.2.1, or empty.");
    return {};
}

Result<> checkSftpSettings(const SftpSettings& settings) {
    if (settings.port < 1 || settings.port > highestPort)
        return refuse("The SFTP port is " + std::to_string(settings.port) +
                      "; it has to be from 1 to 65535.");
    return {};
}

} // namespace velt
