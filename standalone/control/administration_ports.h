// How an administrator reaches this machine from elsewhere.
#ifndef VELT_STANDALONE_CONTROL_ADMINISTRATION_PORTS_H
#define VELT_STANDALONE_CONTROL_ADMINISTRATION_PORTS_H

#include "standalone/firewall/firewall_table.h"

#include <string_view>
#include <vector>

namespace velt {

/// The TCP ports, other than loopback's, on which the machine's own OpenSSH and veltd listen in this network,
/// in ascending order; and, where systemd starts the machine's OpenSSH at boot, those that its configuration
/// names, since it may come up later than the rules. Our own SFTP daemon's are not among them.
Result<std::vector<AdministrationPort>> administrationPorts();

/// The ports that the text of an OpenSSH configuration names; none where it names none.
std::vector<int> portsOfSshConfiguration(std::string_view text);

} // namespace velt

#endif
