// Tables of others that can undo what ours accepts.
#ifndef VELT_STANDALONE_FIREWALL_FOREIGN_TABLES_H
#define VELT_STANDALONE_FIREWALL_FOREIGN_TABLES_H

#include <string>
#include <string_view>
#include <vector>

namespace velt {

/// From nft's list of chains in JSON: each input chain outside our table that drops what no rule of its own
/// accepts, as "inet filter input". A packet must pass every chain, so our accept does not help there. Empty
/// for a text that is not such a list.
std::vector<std::string> foreignDropChains(std::string_view chainsAsJson);

} // namespace velt

#endif
