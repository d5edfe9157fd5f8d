#include "standalone/control/services.h"

#include "standalone/control/daemon_control.h"
#include "standalone/core/boundary.h"
#include "standalone/core/effects.h"
#include "standalone/core/last_error.h"
#include "standalone/settings/settings.h"

#include <syslog.h>

#include <optional>

namespace velt {
namespace {

int startOrStop(Daemon daemon, bool wanted) {
    return perform(wanted ? Effect::start : Effect::stop, daemonName(daemon),
                   [=] { return wanted ? startDaemon(daemon) : stopDaemon(daemon); });
}

} // namespace

int startEnabledServices() {
    return atBoundary([] {
        followWithFirewall(); // its rules went with the boot as well
        const auto ftp = orLastError(loadFtpSettings());
        const int ftpResult = ftp ? startOrStop(Daemon::ftp, enablesFtp(ftp->record)) : -1;
        if (ftpResult < 0) {
            ::syslog(LOG_ERR, "%s", lastErrorSentence().c_str());
        }
        std::optional<LastErrorKept> first; // what the second has to say goes to the log only
        if (ftpResult < 0) {
            first.emplace();
        }
        const auto sftp = orLastError(loadSftpSettings());
        const int sftpResult = sftp ? startOrStop(Daemon::sftp, sftp->enabled) : -1;
        if (sftpResult < 0) {
            ::syslog(LOG_ERR, "%s", lastErrorSentence().c_str());
        }
        return ftpResult < 0 ? ftpResult : sftpResult;
    });
}

int stopServices() {
    return atBoundary([] {
        const int ftpResult = startOrStop(Daemon::ftp, false);
        const int sftpResult = startOrStop(Daemon::sftp, false);
        return ftpResult < 0 ? ftpResult : sftpResult;
    });
}

ServiceState serviceState(const std::string& service) {
    const auto daemon = daemonOf(service.c_str());
    return daemon ? daemonState(*daemon) : ServiceState{};
}

std::uint64_t daemonRestarts(const std::string& service) {
    const LastErrorKept kept;
    const auto daemon = daemonOf(service.c_str());
    return daemon ? daemonState(*daemon).restarts : 0;
}

} // namespace velt
