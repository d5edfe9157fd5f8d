// Supervisors as systemd's units.
#ifndef VELT_STANDALONE_CONTROL_SYSTEMD_LAUNCHER_H
#define VELT_STANDALONE_CONTROL_SYSTEMD_LAUNCHER_H

#include "standalone/control/supervisor_launcher.h"

#include <filesystem>
#include <string>

namespace velt {

/// What the launcher uses of the machine.
struct SystemdPlaces {
    std::string systemctl = "systemctl";
    /// Units that are gone after a boot: what is to run then is decided anew from the stored settings.
    std::filesystem::path units = "/run/systemd/system";
};

/// A supervisor that is killed is started again by systemd, with the plan that was launched or kept last.
class SystemdLauncher : public SupervisorLauncher {
public:
    explicit SystemdLauncher(std::string daemon, SystemdPlaces places = {});

    std::string launch(const std::filesystem::path& directory, const DaemonPlan& plan) override;
    std::string keep(const std::filesystem::path& directory, const DaemonPlan& plan) override;
    std::string retire() override;

private:
    std::string writeUnits(const std::filesystem::path& directory) const;
    std::string reasonOfFailure() const;

    std::string daemon_;
    SystemdPlaces places_;
};

} // namespace velt

#endif
