// The kernel's own number for the packet filter rules in force.
#ifndef VELT_STANDALONE_FIREWALL_RULESET_GENERATION_H
#define VELT_STANDALONE_FIREWALL_RULESET_GENERATION_H

#include <cstdint>
#include <optional>

namespace velt {

/// The number of the rules in force in this process's network: each change, by any program, raises it by
/// one. Nothing when the kernel does not tell, as it does not without the right to change the rules.
/// Thread-safe.
std::optional<std::uint32_t> rulesetGeneration();

} // namespace velt

#endif
