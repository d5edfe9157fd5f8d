// Supervisors as systemd's units.
#ifndef VELT_STANDALONE_CONTROL_SYSTEMD_LAUNCHER_H
#define VELT_STANDALONE_CONTROL_SYSTEMD_LAUNCHER_H

#include "standalone/control/supervisor_launcher.h"
#include "standalone/daemons/daemon.h"

#include <filesystem>
#include <string>

namespace velt {

/// What the launcher uses of the machine.
struct SystemdPlaces {
    std::string systemctl = "systemctl";
    /// Units that are gone after a boot: what is to run then is decided again from the stored settings.
    std::filesystem::path units = "/run/systemd/system";
};

/// A supervisor that is killed is started again by systemd, with the order that was launched or kept last.
class SystemdLauncher : public SupervisorLauncher {
public:
    explicit SystemdLauncher(const Daemon& daemon, SystemdPlaces places = {});

    Result<> launch(const std::filesystem::path& folder, const DaemonOrder& order) override;
    Result<> keep(const std::filesystem::path& folder, const DaemonOrder& order) override;
    Result<> retire() override;
    Result<> release(const std::filesystem::path& folder) override;

private:
    Result<> writeUnits(const std::filesystem::path& folder) const;
    std::string reasonOfFailure() const;

    const Daemon& daemon_;
    std::string unit_;
    SystemdPlaces places_;
};

} // namespace velt

#endif
