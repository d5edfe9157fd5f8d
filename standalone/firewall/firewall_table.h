// Our table in the machine's packet filter.
#ifndef VELT_STANDALONE_FIREWALL_FIREWALL_TABLE_H
#define VELT_STANDALONE_FIREWALL_FIREWALL_TABLE_H

#include "base/result.h"
#include "ftp/ftp_library.h"

#include <functional>
#include <vector>

namespace velt {

/// Makes the rules in force those that open these ports; does nothing when they are already. The ports are
/// asked for under the StateLock, and only when rules are to be made. Safe from all threads and processes.
Result<> loadFirewallRules(const std::function<Result<std::vector<VELT_FTP_PORT_RANGE>>()>& openPorts);

} // namespace velt

#endif
