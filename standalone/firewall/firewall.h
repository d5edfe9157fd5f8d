// Our table in the machine's packet filter.
#ifndef VELT_STANDALONE_FIREWALL_FIREWALL_H
#define VELT_STANDALONE_FIREWALL_FIREWALL_H

#include "base/result.h"

namespace velt {

/// Makes the rules in force those that follow from the stored settings; does nothing when they are already.
/// Safe from all threads and processes.
Result<> loadFirewallRules();

} // namespace velt

#endif
