// Supervisors that detach themselves from the process which starts them.
#ifndef VELT_STANDALONE_CONTROL_CHILD_LAUNCHER_H
#define VELT_STANDALONE_CONTROL_CHILD_LAUNCHER_H

#include "standalone/control/supervisor_launcher.h"

#include <string>

namespace velt {

/// A supervisor that is killed stays away: the next start finds what it left and begins from scratch.
class ChildLauncher : public SupervisorLauncher {
public:
    explicit ChildLauncher(std::string_view daemon) : daemon_(daemon) {}

    Result<> launch(const std::filesystem::path& folder, const DaemonOrder& order) override;
    Result<> keep(const std::filesystem::path&, const DaemonOrder&) override { return {}; }
    Result<> retire() override { return {}; }
    Result<> release(const std::filesystem::path&) override { return {}; }

private:
    std::string daemon_;
};

} // namespace velt

#endif
