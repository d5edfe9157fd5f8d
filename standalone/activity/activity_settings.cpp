#include "standalone/activity/activity_settings.h"

#include "standalone/activity/spool.h"
#include "standalone/core/paths.h"
#include "standalone/core/state_root.h"
#include "standalone/core/strict_file.h"

namespace velt {
namespace {

// A larger value is a typing error.
constexpr std::int64_t mostDays = 36'500;
constexpr std::int64_t mostMegabytes = 100'000'000;
constexpr std::int64_t megabyte = 1'000'000;

} // namespace

static_assert(paths::activitySettings == VELT_ACTIVITY_SETTINGS);

Result<ActivitySettings> loadActivitySettings() {
    VELT_ASSIGN_OR_RETURN(StrictFile file, StrictFile::load(statePath(paths::activitySettings)));
    ActivitySettings settings;
    OperationLimits& limits = settings.limits;
    settings.record = file.boolean("record", settings.record, optionalKey);
    limits.age = std::chrono::days(file.number("max_age_days", 0, mostDays, limits.age.count(), optionalKey));
    limits.size =
        megabyte * file.number("max_size_mb", 0, mostMegabytes, limits.size / megabyte, optionalKey);
    settings.xferlog = file.boolean("xferlog", settings.xferlog, optionalKey);
    settings.syslog = file.boolean("syslog", settings.syslog, optionalKey);
    VELT_RETURN_IF_ERROR(file.finish());
    return settings;
}

} // namespace velt
