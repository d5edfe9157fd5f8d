// What the administrator wants of the firewall.
#ifndef VELT_STANDALONE_FIREWALL_FIREWALL_SETTINGS_H
#define VELT_STANDALONE_FIREWALL_FIREWALL_SETTINGS_H

#include "ftp/ftp_library.h"

#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace velt {

enum class FirewallMode {
    off,    ///< no table of ours
    accept, ///< our ports are accepted, nothing is dropped
    drop,   ///< what comes in is dropped, but for our ports and the further ones
};

struct FirewallSettings {
    FirewallMode mode = FirewallMode::accept;
    std::vector<VELT_FTP_PORT_RANGE> furtherPorts; ///< open in mode drop
};

/// Reads the text of the settings' file:
///
///     version = 1
///     mode = drop
///     ports = 22 443 8000-8010
///
/// `file` names it in errors. Nothing, with the last error naming file and line, when it does not have this
/// form.
std::optional<FirewallSettings> parseFirewallSettings(std::string_view text, const std::string& file);

/// The settings of /etc/velt/firewall.conf below the state root, the defaults where there is none. Nothing,
/// with the last error set, when the file cannot be read or is damaged. The table belongs to the machine: an
/// installation below a root other than "/" touches it only when that root has a file of its own, and takes
/// its rules away again by the mode off, not by the removal of the file.
std::optional<FirewallSettings> loadFirewallSettings();

} // namespace velt

#endif
