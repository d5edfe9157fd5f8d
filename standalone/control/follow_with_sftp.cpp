#include "standalone/control/follow_with_sftp.h"

#include "standalone/control/daemon_control.h"
#include "standalone/control/supervised_daemon.h"
#include "standalone/core/effects.h"

namespace velt {

Result<> followWithSftp() {
    if (!isServing(daemonState(sftpDaemon))) {
        return {};
    }
    return perform(Effect::start, sftpDaemon.name, [] { return startDaemon(sftpDaemon); });
}

} // namespace velt
