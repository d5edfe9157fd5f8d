// Why a daemon did not come up when it was last asked to, for everybody who asks later.
#ifndef VELT_STANDALONE_CONTROL_START_FAILURE_H
#define VELT_STANDALONE_CONTROL_START_FAILURE_H

#include <optional>
#include <string>

namespace velt {

/// Notes the outcome of a start: the last error's sentence when `result` is negative, else that no failure
/// stands. Returns `result`, and leaves the last error alone; a note that cannot be written is missing. One
/// at a time for each daemon.
int noteOutcome(const std::string& daemon, int result);

/// The sentence of the daemon's last start, or restart, when that failed and nothing succeeded since.
std::optional<std::string> startFailure(const std::string& daemon);

} // namespace velt

#endif
