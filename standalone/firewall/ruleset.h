// The firewall's rules as text for the program nft.
#ifndef VELT_STANDALONE_FIREWALL_RULESET_H
#define VELT_STANDALONE_FIREWALL_RULESET_H

#include "standalone/firewall/firewall_settings.h"

#include <string>
#include <vector>

namespace velt {

/// A script that replaces our table, or in mode off removes it, whether there is one before or not. nft
/// carries it out as a whole or not at all. `ports` are those that the services need.
std::string renderRuleset(const FirewallSettings& settings, const std::vector<VELT_FTP_PORT_RANGE>& ports);

} // namespace velt

#endif
