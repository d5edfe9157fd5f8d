// /api/log: the administrator log.
#ifndef VELT_HOST_API_LOG_PAGE_H
#define VELT_HOST_API_LOG_PAGE_H

#include "host/api/route.h"
#include "standalone/standalone.h"

#include <json/value.h>

namespace velt::host {

Json::Value toObject(const LogEntry& entry);

/// GET with the filters since, event, actor, before and limit.
Route logRoute();

} // namespace velt::host

#endif
