// Daemons as systemd's units.
#ifndef VELT_STANDALONE_SERVICES_SYSTEMD_BACKEND_H
#define VELT_STANDALONE_SERVICES_SYSTEMD_BACKEND_H

#include "standalone/services/service_backend.h"

#include <chrono>
#include <filesystem>
#include <string>
#include <vector>

namespace velt {

/// What the backend uses of the machine.
struct SystemdPlaces {
    std::string systemctl = "systemctl";
    std::string journalctl = "journalctl";
    /// Units that are gone after a boot: what is to run then is decided anew from the stored settings.
    std::filesystem::path units = "/run/systemd/system";
    std::filesystem::path cgroups = "/sys/fs/cgroup";
};

class SystemdBackend : public ServiceBackend {
public:
    explicit SystemdBackend(std::string daemon, SystemdPlaces places = {});

    int start(const DaemonPlan& plan) override;
    int pause() override;
    int stop() override;
    ServiceState state() const override;

private:
    using Clock = std::chrono::steady_clock;

    int writeUnit(const DaemonPlan& plan) const;
    int waitUntilServing(Clock::time_point deadline) const;
    int endListener() const;
    std::string property(const std::string& name) const;
    std::vector<ProcessId> unitProcesses(const std::string& controlGroup) const;
    std::string reasonInJournal() const;

    std::string daemon_;
    SystemdPlaces places_;
};

} // namespace velt

#endif
