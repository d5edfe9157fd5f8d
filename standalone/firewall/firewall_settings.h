// What the administrator wants of the firewall.
#ifndef VELT_STANDALONE_FIREWALL_FIREWALL_SETTINGS_H
#define VELT_STANDALONE_FIREWALL_FIREWALL_SETTINGS_H

#include "base/result.h"
#include "ftp/ftp_library.h"

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
    bool force = false; ///< in mode drop, the ports by which the server is administered may be closed
};

/// The settings of the file
///
///     version = 1
///     mode = drop
///     ports = 22 443 8000-8010
///     force = 0
///
/// or the defaults without a file. The table belongs to the machine: an installation below a root other than
/// "/" touches it only when that root has a file of its own, and takes its rules away again by the mode off,
/// not by the removal of the file.
Result<FirewallSettings> loadFirewallSettings();

} // namespace velt

#endif
