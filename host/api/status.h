// /api/status: the state of the host and its services.
#ifndef VELT_HOST_API_STATUS_H
#define VELT_HOST_API_STATUS_H

#include "host/api/route.h"
#include "host/module/module_table.h"

#include <vector>

namespace velt::host {

/// Counts the up-time from now on. The table outlives the routes.
std::vector<Route> statusRoutes(const ModuleTable& table);

} // namespace velt::host

#endif
