#include "standalone/core/paths.h"
#include "standalone/core/state_root.h"
#include "standalone/daemons/daemon.h"
#include "standalone/health/checks.h"
#include "standalone/health/mends.h"
#include "standalone/settings/confinement_settings.h"

#include <unistd.h>

namespace velt {
namespace {

/// The command that writes the file anew: it has one setting.
std::string switchOn() {
    return "printf 'version = 1\\nsftp = 1\\n' >" +
           shellWord(statePath(paths::confinementSettings).string()) + " && " + restartOf(sftpDaemon);
}

} // namespace

Findings confinementFindings() {
    const auto sftp = sftpDaemon.settings();
    const auto confinement = loadConfinementSettings();
    // Without root's rights the service has one user, and nothing to hold that user to.
    if (!sftp || !sftp->enabled() || !confinement || confinement->sftp || ::geteuid() != 0) {
        return {};
    }
    return {{"sftp-not-confined", Severity::notice, "sftp",
             "SFTP is not confined: its users see the whole server as far as Unix modes let them, whatever "
             "the rules and the shares grant.",
             switchOn()}};
}

} // namespace velt
