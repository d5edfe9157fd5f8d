// Our table in the machine's packet filter.
#ifndef VELT_STANDALONE_FIREWALL_FIREWALL_TABLE_H
#define VELT_STANDALONE_FIREWALL_FIREWALL_TABLE_H

#include "base/result.h"
#include "ftp/ftp_library.h"
#include "standalone/firewall/banned_sources.h"
#include "standalone/firewall/firewall_settings.h"

#include <functional>
#include <optional>
#include <string>
#include <vector>

namespace velt {

/// A port by which an administrator reaches this machine.
struct AdministrationPort {
    int port = 0;
    std::string program; ///< that listens there: "sshd"

    bool operator==(const AdministrationPort&) const = default;
};

/// What the rules are to do.
struct FirewallNeeds {
    std::vector<VELT_FTP_PORT_RANGE> openPorts;  ///< for everybody
    std::vector<VELT_FTP_PORT_RANGE> loginPorts; ///< closed to those who are banned
    std::vector<BannedSource> banned;
    bool onlyFromHere = false; ///< the services listen on the loopback interface alone
    /// Asked only where rules are to be loaded that close ports; empty: there are none.
    std::function<Result<std::vector<AdministrationPort>>()> administration = {};
};

/// The first of these ports that the rules would close; nothing when they leave all of them open.
std::optional<AdministrationPort> firstClosed(const std::vector<AdministrationPort>& ports,
                                              const FirewallSettings& firewall,
                                              const std::vector<VELT_FTP_PORT_RANGE>& openPorts);

/// Makes the rules in force those that are needed; does nothing when they are already. Rules that would lock
/// the administrator out are refused, unless the settings force them, and those before stay. They are asked
/// for under the StateLock, and only when rules are to be made. Safe from all threads and processes.
Result<> loadFirewallRules(const std::function<Result<FirewallNeeds>()>& askNeeds);

/// Fails where loadFirewallRules would, as far as that can be told without loading: settings that cannot be
/// read, or rules that would lock the administrator out. For one who holds the StateLock.
Result<> checkFirewallRules(const std::function<Result<FirewallNeeds>()>& askNeeds);

} // namespace velt

#endif
