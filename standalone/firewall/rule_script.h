// Carrying out a script for the program nft, and what it has made.
#ifndef VELT_STANDALONE_FIREWALL_RULE_SCRIPT_H
#define VELT_STANDALONE_FIREWALL_RULE_SCRIPT_H

#include "base/result.h"

#include <cstdint>
#include <optional>
#include <string>

namespace velt {

/// The rules belong to the machine, so an installation below another root leaves them alone unless it was
/// told about a firewall: its defaults would take away what the machine's own installation drops.
Result<bool> mayTouchRules();

/// Carries the script out, as a whole or not at all. It has to change something. Returns the generation of
/// the rules before; nothing where it cannot be told.
Result<std::optional<std::uint32_t>> runRuleScript(const std::string& script);

/// Our table as nft lists it in JSON; "" when there is none, or it cannot be listed.
std::string listTable();

} // namespace velt

#endif
