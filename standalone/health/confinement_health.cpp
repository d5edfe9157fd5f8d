#include "standalone/daemons/daemon.h"
#include "standalone/health/checks.h"
#include "standalone/settings/confinement_settings.h"

#include <unistd.h>

namespace velt {

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
             "veltctl confinement set sftp=on"}};
}

} // namespace velt
