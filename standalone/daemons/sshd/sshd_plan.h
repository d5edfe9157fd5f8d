// How the SFTP settings become a running daemon.
#ifndef VELT_STANDALONE_DAEMONS_SSHD_SSHD_PLAN_H
#define VELT_STANDALONE_DAEMONS_SSHD_SSHD_PLAN_H

#include "base/result.h"
#include "standalone/daemons/daemon.h"
#include "standalone/settings/confinement_settings.h"
#include "standalone/settings/settings.h"

#include <optional>
#include <string>

namespace velt {

/// Puts the configuration that would follow from these settings to the daemon's own test, and returns its
/// hash, see Daemon::test. Nothing that a running daemon uses is touched.
Result<std::string> testSftpCandidate(const SftpSettings& settings, const ConfinementSettings& confinement);

/// The plan that follows from the stored settings, see Daemon::plan: always one, since SFTP may be started by
/// name while its setting is off.
Result<std::optional<DaemonPlan>> planSftpDaemon();

} // namespace velt

#endif
