// Tables of others that can undo what ours accepts.
#ifndef VELT_STANDALONE_FIREWALL_FOREIGN_TABLES_H
#define VELT_STANDALONE_FIREWALL_FOREIGN_TABLES_H

#include "ftp/ftp_library.h"
#include "standalone/firewall/listed_rules.h"

#include <string>
#include <vector>

namespace velt {

/// An input chain outside our table that does not let new connections to some ports through. A packet must
/// pass every chain, so our accept does not help there.
struct ClosingChain {
    std::string name;                       ///< "inet filter input"
    std::vector<VELT_FTP_PORT_RANGE> ports; ///< those of the wanted ranges that it closes an end of
    bool surely = false;                    ///< to everybody; else some of them may be let in

    /// Says so, for people.
    std::string sentence() const;
};

/// The chains that close ports, as far as their rules tell. `fromHere`: for connections over the loopback
/// interface.
std::vector<ClosingChain> closingChains(const ListedRules& rules,
                                        const std::vector<VELT_FTP_PORT_RANGE>& ports, bool fromHere);

/// Whether a chain, ours or another's, keeps this server itself from the port.
bool closesToThisServer(const ListedRules& rules, int port);

/// All rules in force, or where there are too many of them, the chains. Nothing when they cannot be listed.
std::optional<ListedRules> listRules();

} // namespace velt

#endif
