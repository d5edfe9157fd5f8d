// What a change of the settings does, step by step.
#ifndef VELT_STANDALONE_CHANGE_CHANGE_STEP_H
#define VELT_STANDALONE_CHANGE_CHANGE_STEP_H

#include <string>
#include <string_view>
#include <vector>

namespace velt {

enum class StepKind {
    store,       ///< a file of settings: "ftp settings"
    start,       ///< a daemon that does not run: "ftp"
    handOver,    ///< a daemon gives its port to a new one; its sessions go on with what they began with
    pause,       ///< a daemon stops listening; its sessions go on
    stop,        ///< a daemon and its sessions
    close,       ///< a daemon that is switched off stops listening; its sessions go on to their end
    endSessions, ///< of a daemon that goes on
    openPort,    ///< "21", or "55536-55899"
    closePort,   ///< the same
    event,       ///< a system event: "ftpd stop"
    logEntry,    ///< an entry of the administrator log: its sentence
};

struct ChangeStep {
    StepKind kind;
    std::string subject;

    bool operator==(const ChangeStep&) const = default;
};

using ChangeSteps = std::vector<ChangeStep>;

/// "store", "start", "hand over", "pause", "stop", "close", "end sessions", "open port", "close port",
/// "event", "log".
std::string_view stepName(StepKind kind);

} // namespace velt

#endif
