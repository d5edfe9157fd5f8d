#include "standalone/daemons/proftpd/session_rights.h"

#include "base/file.h"
#include "standalone/core/strict_file.h"
#include "standalone/settings/lost_rights.h"
#include "standalone/settings/settings_files.h"

namespace velt {
namespace {

constexpr const char* settingsFile = "settings";

Result<FtpSettings> loadPlanSettings(const std::filesystem::path& plan) {
    const auto path = plan / settingsFile;
    VELT_ASSIGN_OR_RETURN(const auto text, readFile(path));
    VELT_ASSIGN_OR_RETURN(StrictFile file,
                          StrictFile::parse(path.string(), text, {ftpSettingsFile().version}));
    return readSettings(ftpSettingsFile(), file);
}

} // namespace

Result<> storePlanSettings(const std::filesystem::path& plan, const FtpSettings& settings) {
    return replaceFile(plan / settingsFile, formatSettings(ftpSettingsFile(), settings), 0600);
}

bool takesFtpRights(const std::filesystem::path& former, const std::filesystem::path& next) {
    const auto one = loadPlanSettings(former);
    const auto other = loadPlanSettings(next);
    return !one || !other || takesRights(*one, *other);
}

} // namespace velt
