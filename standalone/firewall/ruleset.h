// The firewall's rules as text for the program nft.
#ifndef VELT_STANDALONE_FIREWALL_RULESET_H
#define VELT_STANDALONE_FIREWALL_RULESET_H

#include "standalone/firewall/firewall_settings.h"

#include <string>
#include <vector>

namespace velt {

/// A script that replaces our table, or in mode off removes it, whether there is one before or not. nft
/// carries it out as a whole or not at all. `openPorts` are those that the services need; from `loginPorts`,
/// those on which they accept logins, the addresses in the sets banned4 and banned6 are kept away.
std::string renderRuleset(const FirewallSettings& settings, const std::vector<VELT_FTP_PORT_RANGE>& openPorts,
                          const std::vector<VELT_FTP_PORT_RANGE>& loginPorts);

} // namespace velt

#endif
