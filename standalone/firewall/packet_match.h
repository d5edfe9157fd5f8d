// Conditions of nft's rules, judged for a new connection.
#ifndef VELT_STANDALONE_FIREWALL_PACKET_MATCH_H
#define VELT_STANDALONE_FIREWALL_PACKET_MATCH_H

#include "standalone/firewall/listed_rules.h"

#include <functional>
#include <optional>
#include <string>

namespace velt {

/// The elements of the set or map of this name; null for one that is not known.
using NamedElements = std::function<const Json::Value*(const std::string& name)>;

/// Whether the connection meets a condition, nft's "match" in JSON; nothing where that cannot be told.
std::optional<bool> isMet(const Json::Value& match, const NewConnection& connection,
                          const NamedElements& elements);

/// The verdict that a map, nft's "vmap" in JSON, has for the connection: null where it has none; nothing
/// where that cannot be told.
std::optional<Json::Value> verdictOf(const Json::Value& map, const NewConnection& connection,
                                     const NamedElements& elements);

} // namespace velt

#endif
