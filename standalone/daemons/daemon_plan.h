// How the stored settings become a running daemon.
#ifndef VELT_STANDALONE_DAEMONS_DAEMON_PLAN_H
#define VELT_STANDALONE_DAEMONS_DAEMON_PLAN_H

#include "standalone/supervise/daemon_order.h"

#include <filesystem>

namespace velt {

struct DaemonPlan {
    DaemonOrder order;
    std::filesystem::path folder; ///< holds what this configuration alone uses; its siblings are former ones'
};

/// Removes what former configurations left beside the folder of this one. To be called when its daemon
/// serves: until then the former one may be needed again.
void removeFormerPlans(const DaemonPlan& plan);

} // namespace velt

#endif
