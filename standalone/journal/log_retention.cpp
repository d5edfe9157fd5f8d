#include "standalone/journal/log_retention.h"

#include "standalone/core/paths.h"
#include "standalone/core/state_root.h"
#include "standalone/core/strict_file.h"

namespace velt {

namespace {

// A larger value is a typing error.
constexpr std::int64_t mostEntries = 100'000'000;
constexpr std::int64_t mostDays = 36'500;

constexpr FileVersions versions{1, false};

} // namespace

Result<LogRetention> loadRetention() {
    VELT_ASSIGN_OR_RETURN(StrictFile file, StrictFile::load(statePath(paths::logRetention), versions));
    LogRetention retention;
    retention.maxEntries = file.number("max_entries", 0, mostEntries, retention.maxEntries, optionalKey);
    retention.maxAgeDays = file.number("max_age_days", 0, mostDays, retention.maxAgeDays, optionalKey);
    VELT_RETURN_IF_ERROR(file.finish());
    return retention;
}

} // namespace velt
