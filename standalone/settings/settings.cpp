#include "standalone/settings/settings.h"

#include "base/number_text.h"
#include "schema/settings_table.h"
#include "standalone/settings/settings_files.h"

#include <cstring>

namespace velt {

FtpSettings defaultFtpSettings() {
    return defaultSettings(ftpSettingsFile());
}

SftpSettings defaultSftpSettings() {
    return defaultSettings(sftpSettingsFile());
}

int controlPort(const _tag_VELT_FTP_CONF_& record) {
    const std::string_view text(record.portnum, ::strnlen(record.portnum, sizeof(record.portnum)));
    const auto port = parseNumber(text);
    // A port is written in one way, without zeros in front.
    const bool plain = port && text.front() != '0';
    return plain && *port >= 1 && *port <= schema::highestPort ? static_cast<int>(*port) : 0;
}

bool enablesFtp(const _tag_VELT_FTP_CONF_& record) {
    return (record.service_flags & (VELT_FTP_SERVICE_PLAIN | VELT_FTP_SERVICE_TLS)) != 0;
}

VELT_FTP_PORT_RANGE passiveRange(const _tag_VELT_FTP_CONF_& record) {
    const bool custom = record.passive_port_min != 0 && record.passive_port_max != 0;
    return custom ? VELT_FTP_PORT_RANGE{record.passive_port_min, record.passive_port_max}
                  : defaultPassiveRange;
}

} // namespace velt
