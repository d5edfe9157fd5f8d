// Daemons under velt-supervise.
#ifndef VELT_STANDALONE_SERVICES_SUPERVISE_BACKEND_H
#define VELT_STANDALONE_SERVICES_SUPERVISE_BACKEND_H

#include "standalone/services/service_backend.h"

namespace velt {

class SuperviseBackend : public ServiceBackend {
public:
    explicit SuperviseBackend(std::string daemon);

    int start(const DaemonPlan& plan) override;
    int pause() override;
    int stop() override;
    ServiceState state() const override;

private:
    int launchSupervisor(const std::filesystem::path& directory, const DaemonPlan& plan) const;
    int failToStart(const std::string& reason) const;

    std::string daemon_;
};

} // namespace velt

#endif
