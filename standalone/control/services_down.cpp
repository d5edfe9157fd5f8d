#include "standalone/control/services_down.h"

#include "standalone/control/daemon_control.h"
#include "standalone/control/service_backend.h"
#include "standalone/control/start_failure.h"
#include "standalone/core/last_error.h"
#include "standalone/settings/settings.h"

namespace velt {
namespace {

/// Why a daemon that nobody failed to start does not serve.
std::string reasonOf(Daemon daemon, const ServiceState& state) {
    const std::string title = daemonTitle(daemonName(daemon));
    if (state.state == RunState::paused) {
        return title + " is paused.";
    }
    return title + " does not run" + (state.reason.empty() ? "." : ": " + state.reason + ".");
}

void addIfDown(Daemon daemon, std::vector<ServiceDown>& down) {
    const std::string service = daemon == Daemon::ftp ? "ftp" : "sftp";
    const ServiceState state = daemonState(daemon);
    const auto failure = startFailure(daemonName(daemon));
    if (!isServing(state)) {
        down.push_back({service, failure.value_or(reasonOf(daemon, state)), false});
    } else if (failure) {
        down.push_back({service, *failure, true});
    }
}

} // namespace

std::vector<ServiceDown> servicesDown() {
    const LastErrorKept kept;
    std::vector<ServiceDown> down;
    const auto ftp = orLastError(loadFtpSettings());
    if (!ftp) {
        down.push_back({"ftp", lastErrorSentence(), isServing(daemonState(Daemon::ftp))});
    } else if (enablesFtp(ftp->record)) {
        addIfDown(Daemon::ftp, down);
    }
    const auto sftp = orLastError(loadSftpSettings());
    if (!sftp) {
        down.push_back({"sftp", lastErrorSentence(), isServing(daemonState(Daemon::sftp))});
    } else if (sftp->enabled) {
        addIfDown(Daemon::sftp, down);
    }
    return down;
}

} // namespace velt
