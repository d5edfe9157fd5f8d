#include "standalone/control/start_failure.h"
#include "base/file.h"

#include "standalone/core/paths.h"
#include "standalone/core/state_root.h"

#include <unistd.h>

#include <filesystem>

namespace velt {

std::filesystem::path startFailureNote(const Daemon& daemon) {
    return statePath(paths::run) / (std::string(daemon.name) + ".failure");
}

Result<> noteOutcome(const Daemon& daemon, Result<> outcome) {
    if (outcome) {
        ::unlink(startFailureNote(daemon).c_str());
    } else {
        (void)replaceFile(startFailureNote(daemon), outcome.error().message, 0644);
    }
    return outcome;
}

std::optional<std::string> startFailure(const Daemon& daemon) {
    const auto note = readFile(startFailureNote(daemon));
    return note ? std::optional(*note) : std::nullopt;
}

} // namespace velt
