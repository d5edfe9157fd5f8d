#include "standalone/control/start_failure.h"

#include "base/file.h"
#include "standalone/core/last_error.h"
#include "standalone/core/paths.h"
#include "standalone/core/state_root.h"

#include <filesystem>
#include <system_error>

namespace velt {
namespace {

std::filesystem::path noteFile(const std::string& daemon) {
    return statePath(paths::run) / (daemon + ".failure");
}

} // namespace

int noteOutcome(const std::string& daemon, int result) {
    if (result >= 0) {
        std::error_code ignored;
        std::filesystem::remove(noteFile(daemon), ignored);
        return result;
    }
    const LastErrorKept kept;
    static_cast<void>(replaceFile(noteFile(daemon), lastErrorSentence(), 0644));
    return result;
}

std::optional<std::string> startFailure(const std::string& daemon) {
    const auto note = readFile(noteFile(daemon));
    return note ? std::optional(*note) : std::nullopt;
}

} // namespace velt
