// How the process velt-supervise of a daemon comes to run.
#ifndef VELT_STANDALONE_CONTROL_SUPERVISOR_LAUNCHER_H
#define VELT_STANDALONE_CONTROL_SUPERVISOR_LAUNCHER_H

#include "standalone/daemons/daemon_plan.h"

#include <filesystem>
#include <string>

namespace velt {

/// For one daemon. Its operations come one at a time. The directory is that of the files about running
/// daemons. What they return is "" on success, else the reason in one line without a full stop.
class SupervisorLauncher {
public:
    virtual ~SupervisorLauncher() = default;

    /// Starts a supervisor, where none runs, and returns when its daemon serves as planned, or within 5 s
    /// with the daemon's reason; nothing runs then.
    virtual std::string launch(const std::filesystem::path& directory, const DaemonPlan& plan) = 0;

    /// To be told when a running supervisor has taken up another plan: whoever starts that supervisor again,
    /// should it be killed, is to do it for this one.
    virtual std::string keep(const std::filesystem::path& directory, const DaemonPlan& plan) = 0;

    /// Sees to it that no supervisor is started again. One that still runs is ended.
    virtual std::string retire() = 0;
};

} // namespace velt

#endif
