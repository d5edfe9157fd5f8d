// Why a daemon did not come up when it was last asked to, for those who ask later.
#ifndef VELT_STANDALONE_CONTROL_START_FAILURE_H
#define VELT_STANDALONE_CONTROL_START_FAILURE_H

#include "base/result.h"
#include "standalone/daemons/daemon.h"

#include <filesystem>
#include <optional>
#include <string>

namespace velt {

/// Notes the outcome of a start, and returns it. A note that cannot be written is missing. One at a time for
/// each daemon.
Result<> noteOutcome(const Daemon& daemon, Result<> outcome);

/// The sentence of the daemon's last start, or restart, when that failed and nothing succeeded since.
std::optional<std::string> startFailure(const Daemon& daemon);

/// The file that has it; missing when there is none.
std::filesystem::path startFailureNote(const Daemon& daemon);

} // namespace velt

#endif
