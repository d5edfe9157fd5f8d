// The firewall's rules as text for the program nft.
#ifndef VELT_STANDALONE_FIREWALL_RULESET_H
#define VELT_STANDALONE_FIREWALL_RULESET_H

#include "standalone/firewall/firewall_settings.h"
#include "standalone/settings/settings.h"

#include <string>
#include <vector>

namespace velt {

/// The TCP ports that the enabled services need: of FTP the control port and the passive range in force, of
/// SFTP its port.
std::vector<VELT_FTP_PORT_RANGE> servicePorts(const FtpSettings& ftp, const SftpSettings& sftp);

/// A script that replaces our table, or in mode off removes it, whether there is one before or not. nft
/// carries it out as a whole or not at all.
std::string renderRuleset(const FirewallSettings& settings,
                          const std::vector<VELT_FTP_PORT_RANGE>& servicePorts);

} // namespace velt

#endif
