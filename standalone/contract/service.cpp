#include "platform/service.h"

#include "base/file.h"
#include "platform/sftp.h"
#include "standalone/control/daemon_control.h"
#include "standalone/core/boundary.h"
#include "standalone/core/effects.h"
#include "standalone/core/last_error.h"
#include "standalone/core/paths.h"
#include "standalone/core/state_root.h"
#include "standalone/settings/settings.h"

#include <functional>
#include <optional>
#include <string>
#include <string_view>

namespace velt {
namespace {

constexpr int keyAfterStart = 1;
constexpr int keyAfterStop = 2;

/// Does `act` with the daemon behind the name, as the effect of that name.
int affect(Effect effect, const char* service, const std::function<int(Daemon)>& act) {
    return atBoundary([&] {
        const auto daemon = daemonOf(service);
        return daemon ? perform(effect, service, [&] { return act(*daemon); }) : -1;
    });
}

int setRunKey(const char* service, int value) {
    return affect(Effect::runKey, service, [service, value](Daemon) {
        if (value != keyAfterStart && value != keyAfterStop) {
            return fail(ErrorNumber::invalid,
                        "The run key " + std::to_string(value) + " is neither 1 nor 2.");
        }
        return toContract(
            replaceFile(statePath(paths::runKeys) / service, std::to_string(value) + "\n", 0644));
    });
}

bool isEnabled(std::string_view service, Daemon daemon) {
    if (daemon == Daemon::sftp) {
        const auto settings = orLastError(loadSftpSettings());
        return settings && settings->enabled;
    }
    const auto settings = orLastError(loadFtpSettings());
    const int bit = service == "ftpd-ssl" ? VELT_FTP_SERVICE_TLS : VELT_FTP_SERVICE_PLAIN;
    return settings && (settings->record.service_flags & bit) != 0;
}

} // namespace
} // namespace velt

extern "C" {

// An unknown service, and settings that cannot be read, are answered with 0 and not with a negative number,
// which would read as enabled.
int VLIBServiceIsEnabled(const char* service) {
    const int enabled = velt::atBoundary([service] {
        const auto daemon = velt::daemonOf(service);
        return daemon && velt::isEnabled(service, *daemon) ? 1 : 0;
    });
    return enabled > 0 ? 1 : 0;
}

int VLIBServicectlStart(const char* service, int) {
    return velt::affect(velt::Effect::start, service, velt::startDaemon);
}

int VLIBServicectlStop(const char* service, int) {
    return velt::affect(velt::Effect::stop, service, velt::stopDaemonForRestart);
}

int VLIBServicecfgRunKeySet(const char* service, int value) {
    return velt::setRunKey(service, value);
}

int VLIBServiceStart(const char* service, int) {
    const int result = velt::affect(velt::Effect::start, service, velt::startDaemon);
    return result < 0 ? result : velt::setRunKey(service, velt::keyAfterStart);
}

int VLIBServiceStop(const char* service, int) {
    const int result = velt::affect(velt::Effect::stop, service, velt::stopDaemon);
    return result < 0 ? result : velt::setRunKey(service, velt::keyAfterStop);
}

int VLIBServicePause(const char* service) {
    return velt::affect(velt::Effect::stop, service, [](velt::Daemon daemon) {
        if (daemon == velt::Daemon::ftp) {
            return velt::fail(velt::ErrorNumber::invalid, "The FTP service cannot be paused, only stopped.");
        }
        return velt::pauseDaemon(daemon);
    });
}

int VLIBServiceResume(const char* service) {
    return velt::affect(velt::Effect::start, service, velt::startDaemon);
}

int VELTSFTPIsAlive(void) {
    const int alive =
        velt::atBoundary([] { return velt::isServing(velt::daemonState(velt::Daemon::sftp)) ? 1 : 0; });
    return alive > 0 ? 1 : 0;
}

} // extern "C"
