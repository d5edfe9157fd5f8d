// What we know of the rules that we loaded last: a note below the state root. To be called under the
// StateLock.
#ifndef VELT_STANDALONE_FIREWALL_LOADED_RULES_H
#define VELT_STANDALONE_FIREWALL_LOADED_RULES_H

#include "base/result.h"

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>

namespace velt {

/// Whether rules of ours were loaded, or were about to be, since the machine started. (Below a state root
/// other than "/" the note outlives a boot, the rules do not.)
Result<bool> rulesWereLoaded();

/// Whether the rules that this script loads are in force: it was the last that we loaded here, and nobody has
/// changed any rule of this network since.
bool rulesAreInForce(std::string_view script);

/// Notes that rules are about to be loaded.
Result<> noteLoading();

/// Notes that the script was loaded. `before` is the generation before loading: when somebody else
/// made a change in between, the rules count as loaded, but not as in force.
void noteLoaded(std::string_view script, std::optional<std::uint32_t> before);

/// Notes that we have changed elements of the rules in force. `before` is the generation before that. When
/// the rules were not in force then, or somebody else made a change in between, they are not in force now.
void noteChanged(std::optional<std::uint32_t> before);

/// Notes what our table looked like (a tablePrint) when it had just been loaded by this script, if nobody
/// has changed any rule since.
void noteListing(std::string_view script, const std::string& print);

/// That print; "" where it is not known for this script. May be called without the lock.
std::string listingAfterLoading(std::string_view script);

/// Notes that no rules of ours are loaded.
void noteRemoved();

} // namespace velt

#endif
