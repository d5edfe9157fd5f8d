#include "standalone/control/start_retry.h"

#include "standalone/control/start_failure.h"
#include "standalone/core/paths.h"
#include "standalone/core/state_root.h"
#include "standalone/ports/port_probe.h"

#include <sys/stat.h>

#include <array>

namespace velt {
namespace {

constexpr std::chrono::seconds shortestPause{1};
constexpr std::chrono::seconds longestPause{30};

/// What a start of any daemon reads.
constexpr std::array files{paths::ftpSettings,       paths::sftpSettings, paths::networkSettings,
                           paths::systemInformation, paths::shares,       paths::chrootRules,
                           paths::givenCertificate,  paths::givenKey,     paths::ownCertificate,
                           paths::ftpPasswd,         paths::ftpGroup,     paths::hostKeys};

/// Changes when the file does.
std::string stampOf(const std::filesystem::path& file) {
    struct stat facts {};
    if (::stat(file.c_str(), &facts) != 0) {
        return "none ";
    }
    return std::to_string(facts.st_ino) + ":" + std::to_string(facts.st_size) + ":" +
           std::to_string(facts.st_mode) + ":" + std::to_string(facts.st_mtim.tv_sec) + "." +
           std::to_string(facts.st_mtim.tv_nsec) + " ";
}

} // namespace

std::string StartRetry::surroundings() const {
    std::string text;
    for (const std::string_view file : files) {
        text += stampOf(statePath(file));
    }
    const auto settings = daemon_.settings();
    for (const DaemonPorts& ports : settings ? settings->ports : std::vector<DaemonPorts>()) {
        if (!ports.ofSessions) {
            text += probePorts({ports.range.first}) ? "free " : "taken ";
        }
    }
    return text;
}

bool StartRetry::isDue(const DaemonState& state, Clock::time_point now) {
    const auto failure = startFailure(daemon_);
    if (!failure) {
        note_.clear();
        return false;
    }
    if (const std::string note = stampOf(startFailureNote(daemon_)); note != note_) {
        // A further failure tells nothing of what has changed since the last look.
        if (note_.empty()) {
            last_ = surroundings();
            tried_ = now;
        }
        note_ = note;
        served_ = false;
    }
    served_ = served_ || isServing(state);
    const bool isKept = state.state == RunState::paused || isAlive(state.supervisor);
    if (served_ || isKept || now - tried_ < shortestPause) {
        return false;
    }
    const auto settings = daemon_.settings();
    if (settings && !settings->enabled()) {
        return false;
    }
    const std::string current = surroundings();
    if (current == last_ && now - tried_ < longestPause) {
        return false;
    }
    last_ = current;
    tried_ = now;
    return true;
}

} // namespace velt
