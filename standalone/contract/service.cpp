#include "platform/service.h"

#include "base/file.h"
#include "platform/sftp.h"
#include "standalone/contract/boundary.h"
#include "standalone/control/daemon_control.h"
#include "standalone/control/supervised_daemon.h"
#include "standalone/core/effects.h"
#include "standalone/core/paths.h"
#include "standalone/core/staged_files.h"

#include <functional>
#include <string>

namespace velt {
namespace {

constexpr int keyAfterStart = 1;
constexpr int keyAfterStop = 2;

Result<const Daemon*> findDaemon(const char* service) {
    const std::string name = service == nullptr ? "" : service;
    const Daemon* daemon = daemonServing(name);
    if (daemon == nullptr) {
        return Error(ErrorNumber::notFound, "There is no service \"" + name + "\".");
    }
    return daemon;
}

/// Does `act` with the daemon behind the name, as the effect of that name.
int affect(Effect effect, const char* service, const std::function<Result<>(const Daemon&)>& act) {
    return atBoundary([&]() -> Result<> {
        VELT_ASSIGN_OR_RETURN(const Daemon* const daemon, findDaemon(service));
        return perform(effect, service, [&] { return act(*daemon); });
    });
}

int setRunKey(const char* service, int value) {
    return affect(Effect::runKey, service, [service, value](const Daemon&) -> Result<> {
        if (value != keyAfterStart && value != keyAfterStop) {
            return Error(ErrorNumber::invalid, "Run key " + std::to_string(value) + ": expected 1 or 2.");
        }
        VELT_ASSIGN_OR_RETURN(const auto file, storePath(std::string(paths::runKeys) + '/' + service));
        return replaceFile(file, std::to_string(value) + "\n", 0644);
    });
}

Result<int> isEnabled(const char* service) {
    VELT_ASSIGN_OR_RETURN(const Daemon* const daemon, findDaemon(service));
    VELT_ASSIGN_OR_RETURN(const auto settings, daemon->settings());
    return isOn(*daemon, settings, service) ? 1 : 0;
}

} // namespace
} // namespace velt

extern "C" {

// An unknown service, and settings that cannot be read, are answered with 0 and not with a negative number,
// which would read as enabled.
int VLIBServiceIsEnabled(const char* service) {
    const int enabled = velt::atBoundary([service] { return velt::isEnabled(service); });
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
    return velt::affect(velt::Effect::stop, service, velt::pauseDaemon);
}

int VLIBServiceResume(const char* service) {
    return velt::affect(velt::Effect::start, service, velt::startDaemon);
}

int VELTSFTPIsAlive(void) {
    const int alive =
        velt::atBoundary([] { return velt::isServing(velt::daemonState(velt::sftpDaemon)) ? 1 : 0; });
    return alive > 0 ? 1 : 0;
}

} // extern "C"
