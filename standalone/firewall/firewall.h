// Our table in the machine's packet filter.
#ifndef VELT_STANDALONE_FIREWALL_FIREWALL_H
#define VELT_STANDALONE_FIREWALL_FIREWALL_H

namespace velt {

/// Makes the rules in force those that follow from the stored settings; does nothing when they are already.
/// Negative on failure, with the last error set. Safe from all threads and processes.
int loadFirewallRules();

} // namespace velt

#endif
