// The firewall and the services: the ports of what is enabled are open.
#ifndef VELT_STANDALONE_CONTROL_SERVICE_FIREWALL_H
#define VELT_STANDALONE_CONTROL_SERVICE_FIREWALL_H

#include "base/result.h"
#include "standalone/firewall/firewall_table.h"

namespace velt {

/// The TCP ports of the enabled services, by the stored settings, and who is banned from them.
Result<FirewallNeeds> firewallNeeds();

/// Makes the firewall follow the stored settings. Safe from all threads and processes.
Result<> openServicePorts();

/// The same after a start or stop. A daemon that does what was asked of it has not failed because of its
/// rules, so a failure only goes to syslog.
void followWithFirewall();

} // namespace velt

#endif
