// What a session of the FTP daemon may do, and whether a change takes some of it away.
#ifndef VELT_STANDALONE_DAEMONS_PROFTPD_SESSION_RIGHTS_H
#define VELT_STANDALONE_DAEMONS_PROFTPD_SESSION_RIGHTS_H

#include "base/result.h"
#include "standalone/settings/settings.h"

#include <filesystem>

namespace velt {

/// Keeps the settings of a plan beside its configuration, for the function below.
Result<> storePlanSettings(const std::filesystem::path& plan, const FtpSettings& settings);

/// takesRights of the settings that were stored in two folders; true when one cannot be read.
bool takesFtpRights(const std::filesystem::path& former, const std::filesystem::path& next);

} // namespace velt

#endif
