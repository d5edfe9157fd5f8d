// How the process velt-supervise of a daemon comes to run.
#ifndef VELT_STANDALONE_CONTROL_SUPERVISOR_LAUNCHER_H
#define VELT_STANDALONE_CONTROL_SUPERVISOR_LAUNCHER_H

#include "base/result.h"
#include "standalone/supervise/daemon_order.h"

#include <chrono>
#include <filesystem>

namespace velt {

/// A start is promised to be over within five seconds, of which the supervisor allows itself a little less.
inline constexpr std::chrono::milliseconds startLimit{4900};

/// For one daemon. Its operations come one at a time. The folder is that of the files about running daemons.
/// The message of an error is a phrase that continues "The FTP daemon does not start: ".
class SupervisorLauncher {
public:
    virtual ~SupervisorLauncher() = default;

    /// Starts a supervisor, where none runs, and returns when its daemon serves as ordered. Fails within 5 s
    /// with the daemon's reason; nothing runs then.
    virtual Result<> launch(const std::filesystem::path& folder, const DaemonOrder& order) = 0;

    /// To be told when a running supervisor has taken up another order: if that supervisor is killed and
    /// started again, it has to be for this one.
    virtual Result<> keep(const std::filesystem::path& folder, const DaemonOrder& order) = 0;

    /// Sees to it that no supervisor is started again. One that still runs is ended.
    virtual Result<> retire() = 0;

    /// The same, but one that still runs goes on until it ends by itself.
    virtual Result<> release(const std::filesystem::path& folder) = 0;
};

} // namespace velt

#endif
