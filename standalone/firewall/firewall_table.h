// Our table in the machine's packet filter.
#ifndef VELT_STANDALONE_FIREWALL_FIREWALL_TABLE_H
#define VELT_STANDALONE_FIREWALL_FIREWALL_TABLE_H

#include "base/result.h"
#include "ftp/ftp_library.h"
#include "standalone/firewall/banned_sources.h"

#include <functional>
#include <vector>

namespace velt {

/// What the rules are to do.
struct FirewallNeeds {
    std::vector<VELT_FTP_PORT_RANGE> openPorts;  ///< for everybody
    std::vector<VELT_FTP_PORT_RANGE> loginPorts; ///< closed to those who are banned
    std::vector<BannedSource> banned;
};

/// Makes the rules in force those that are needed; does nothing when they are already. They are asked for
/// under the StateLock, and only when rules are to be made. Safe from all threads and processes.
Result<> loadFirewallRules(const std::function<Result<FirewallNeeds>()>& askNeeds);

} // namespace velt

#endif
