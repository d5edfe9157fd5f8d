// What a session of the FTP daemon may do, and whether a change takes some of it away.
#ifndef VELT_STANDALONE_DAEMONS_PROFTPD_SESSION_RIGHTS_H
#define VELT_STANDALONE_DAEMONS_PROFTPD_SESSION_RIGHTS_H

#include "base/result.h"
#include "standalone/settings/settings.h"

#include <filesystem>

namespace velt {

/// Whether sessions that began with the former settings may do, or be, what the next ones would not let them:
/// FTP or FTPS is off, weak algorithms or transfers between servers are, anonymous users are, or the folder
/// that users are confined to or the umask of their files is another one. Limits, time-outs, ports, addresses
/// and forms of names are no rights. A pure function.
bool takesRights(const FtpSettings& former, const FtpSettings& next);

/// Keeps the settings of a plan beside its configuration, for the function below.
Result<> storePlanSettings(const std::filesystem::path& plan, const FtpSettings& settings);

/// The same of the settings that were stored in two folders; true when one cannot be read.
bool takesFtpRights(const std::filesystem::path& former, const std::filesystem::path& next);

} // namespace velt

#endif
