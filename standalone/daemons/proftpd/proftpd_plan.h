// How the FTP settings become a running daemon.
#ifndef VELT_STANDALONE_DAEMONS_PROFTPD_PROFTPD_PLAN_H
#define VELT_STANDALONE_DAEMONS_PROFTPD_PROFTPD_PLAN_H

#include "base/result.h"
#include "standalone/daemons/daemon.h"
#include "standalone/settings/settings.h"

#include <optional>
#include <string>

namespace velt {

/// Puts the configuration that would follow from these settings to the daemon's own test, and returns its
/// hash, see Daemon::test. Nothing that a running daemon uses is touched.
Result<std::string> testFtpCandidate(const FtpSettings& settings);

/// The plan that follows from the stored settings, see Daemon::plan. Nothing when they enable neither FTP nor
/// FTPS. Fails also where root may not make the mounts that confine each session.
Result<std::optional<DaemonPlan>> planFtpDaemon();

} // namespace velt

#endif
