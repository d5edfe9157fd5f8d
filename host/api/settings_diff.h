// /api/history/ID/settings and /api/diff: the settings as they were, and what differs between two states.
#ifndef VELT_HOST_API_SETTINGS_DIFF_H
#define VELT_HOST_API_SETTINGS_DIFF_H

#include "host/api/route.h"
#include "host/module/module_table.h"

#include <vector>

namespace velt::host {

/// The table outlives them. Thread-safe if reads and writes are ordered as they say.
std::vector<Route> settingsDiffRoutes(const ModuleTable& table);

} // namespace velt::host

#endif
