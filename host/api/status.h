// /api/status and /healthz: how the services are.
#ifndef VELT_HOST_API_STATUS_H
#define VELT_HOST_API_STATUS_H

#include "host/api/route.h"
#include "host/module/module_table.h"

#include <vector>

namespace velt::host {

/// The time since now is the host's up-time. The table outlives the routes.
std::vector<Route> statusRoutes(const ModuleTable& table);

} // namespace velt::host

#endif
