// The administrator log as the API shows it.
#ifndef VELT_HOST_ADMIN_LOG_JSON_H
#define VELT_HOST_ADMIN_LOG_JSON_H

#include "host/openapi.h"
#include "host/platform_access.h"

#include <json/value.h>

#include <optional>
#include <string>

namespace velt::host {

Json::Value toObject(const AdminLogEntry& entry);

/// Reads "since=...&event=...&actor=...&before=...&limit=...". Nothing, with the part and what was expected
/// of it in `error`, when one is unknown or has no such value.
std::optional<AdminLogQuery> parseLogQuery(const std::string& query, FieldError& error);

} // namespace velt::host

#endif
