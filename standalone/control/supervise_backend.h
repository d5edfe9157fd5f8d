// Daemons under velt-supervise.
#ifndef VELT_STANDALONE_CONTROL_SUPERVISE_BACKEND_H
#define VELT_STANDALONE_CONTROL_SUPERVISE_BACKEND_H

#include "standalone/control/service_backend.h"
#include "standalone/control/supervisor_launcher.h"

#include <memory>

namespace velt {

/// Speaks to the daemon's supervisor, and has the launcher start one where none runs.
class SuperviseBackend : public ServiceBackend {
public:
    /// With supervisors that are nobody's but their own.
    explicit SuperviseBackend(std::string daemon);
    SuperviseBackend(std::string daemon, std::unique_ptr<SupervisorLauncher> launcher);

    int start(const DaemonPlan& plan) override;
    int pause() override;
    int stop() override;
    ServiceState state() const override;

private:
    void keep(const std::filesystem::path& directory, const DaemonPlan& plan);
    int outcome(const std::string& reason) const;

    std::string daemon_;
    std::unique_ptr<SupervisorLauncher> launcher_;
};

} // namespace velt

#endif
