#include "standalone/control/daemon_control.h"

#include "base/file_lock.h"
#include "base/unique_fd.h"
#include "standalone/control/service_backend.h"
#include "standalone/control/start_failure.h"
#include "standalone/core/boundary.h"
#include "standalone/core/effects.h"
#include "standalone/core/last_error.h"
#include "standalone/daemons/candidate.h"
#include "standalone/firewall/firewall.h"
#include "standalone/ports/port_probe.h"
#include "standalone/settings/settings.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <syslog.h>

#include <array>
#include <cerrno>
#include <cstring>
#include <string>
#include <utility>

namespace velt {
namespace {

constexpr std::array<std::pair<std::string_view, Daemon>, 4> services{{
    {"ftpd", Daemon::ftp},
    {"ftpd-pure", Daemon::ftp},
    {"ftpd-ssl", Daemon::ftp},
    {"sftp", Daemon::sftp},
}};

/// One operation on a daemon at a time, over all threads and processes. Not the lock of the settings: a start
/// may take seconds, in which settings can be read and written.
class OperationLock {
public:
    explicit OperationLock(Daemon daemon) {
        const std::filesystem::path directory = runDirectory();
        if (directory.empty()) {
            return;
        }
        const std::filesystem::path file = directory / (daemonName(daemon) + ".operation");
        descriptor_ = UniqueFd(::open(file.c_str(), O_RDWR | O_CREAT | O_CLOEXEC, S_IRUSR | S_IWUSR));
        if (!descriptor_) {
            fail(ErrorNumber::store,
                 "The lock " + file.string() + " cannot be had: " + std::strerror(errno) + ".");
            return;
        }
        held_ = toContract(waitForFileLock(descriptor_.get(), file)) >= 0;
    }

    explicit operator bool() const { return held_; }

private:
    UniqueFd descriptor_;
    bool held_ = false;
};

/// What a stop for a restart needs to know of the stored settings.
struct NextStart {
    bool wanted = false;  ///< false also when the settings cannot be read
    bool possible = true; ///< else the last error says why not
};

/// The configuration's test takes the daemon's time, so nothing is tested where nothing runs.
NextStart nextStart(Daemon daemon, const ServiceState& now) {
    const bool serving = isServing(now);
    const auto portIsFree = [&now](int port) { return toContract(probePorts({port}, now.daemon.pid)) >= 0; };
    if (daemon == Daemon::ftp) {
        const auto settings = orLastError(loadFtpSettings());
        if (!settings || !enablesFtp(settings->record)) {
            return {};
        }
        return {true,
                !serving || (portIsFree(controlPort(settings->record)) && testFtpCandidate(*settings) >= 0)};
    }
    const auto settings = orLastError(loadSftpSettings());
    if (!settings || !settings->enabled) {
        return {};
    }
    return {true, !serving || (portIsFree(settings->port) && testSftpCandidate(*settings) >= 0)};
}

/// After a start or a stop with this result: the rules open the ports of what is enabled, which may have
/// changed although no port did.
int followedByFirewall(int result) {
    if (result >= 0) {
        followWithFirewall();
    }
    return result;
}

/// Nothing, with the last error set, when the settings cannot be read.
std::optional<bool> isEnabled(Daemon daemon) {
    if (daemon == Daemon::ftp) {
        const auto settings = orLastError(loadFtpSettings());
        return settings ? std::optional(enablesFtp(settings->record)) : std::nullopt;
    }
    const auto settings = orLastError(loadSftpSettings());
    return settings ? std::optional(settings->enabled) : std::nullopt;
}

int startPlanned(Daemon daemon) {
    const auto backend = makeServiceBackend(daemonName(daemon));
    if (daemon == Daemon::ftp) {
        const auto settings = orLastError(loadFtpSettings());
        if (!settings) {
            return -1;
        }
        if (!enablesFtp(settings->record)) {
            return backend->stop();
        }
    }
    const auto plan = daemon == Daemon::ftp ? planFtpDaemon() : planSftpDaemon();
    if (!plan || backend->start(*plan) < 0) {
        return -1;
    }
    removeFormerPlans(*plan);
    return 0;
}

} // namespace

void followWithFirewall() {
    const LastErrorKept kept;
    if (toContract(perform(Effect::firewall, "firewall rules", loadFirewallRules)) < 0) {
        ::syslog(LOG_ERR, "%s", lastErrorSentence().c_str());
    }
}

std::string daemonName(Daemon daemon) {
    return daemon == Daemon::ftp ? "ftpd" : "sftp";
}

std::optional<Daemon> daemonOf(const char* service) {
    const std::string_view name = service == nullptr ? std::string_view() : service;
    for (const auto& [known, daemon] : services) {
        if (known == name) {
            return daemon;
        }
    }
    fail(ErrorNumber::notFound, "There is no service \"" + std::string(name) + "\".");
    return std::nullopt;
}

int startDaemon(Daemon daemon) {
    const OperationLock lock(daemon);
    return lock ? followedByFirewall(noteOutcome(daemonName(daemon), startPlanned(daemon))) : -1;
}

int stopDaemon(Daemon daemon) {
    const OperationLock lock(daemon);
    if (!lock) {
        return -1;
    }
    const int result = makeServiceBackend(daemonName(daemon))->stop();
    return followedByFirewall(result < 0 ? result : noteOutcome(daemonName(daemon), result));
}

int stopDaemonForRestart(Daemon daemon) {
    const OperationLock lock(daemon);
    if (!lock) {
        return -1;
    }
    const auto backend = makeServiceBackend(daemonName(daemon));
    const NextStart next = nextStart(daemon, backend->state());
    if (!next.possible) {
        return noteOutcome(daemonName(daemon), -1);
    }
    // What is still wanted is started next, and the firewall follows that.
    const int result = backend->stop();
    return next.wanted ? result : followedByFirewall(result);
}

int pauseDaemon(Daemon daemon) {
    const OperationLock lock(daemon);
    return lock ? makeServiceBackend(daemonName(daemon))->pause() : -1;
}

bool lostItsSupervisor(const ServiceState& state) {
    const bool wasAtWork = state.state == RunState::running || state.state == RunState::failed;
    return wasAtWork && state.supervisor && !isAlive(state.supervisor);
}

int restoreDaemon(Daemon daemon) {
    const OperationLock lock(daemon);
    if (!lock) {
        return -1;
    }
    // Somebody may have taken it in hand while the lock was waited for.
    const ServiceState now = daemonState(daemon);
    if (isServing(now) && !lostItsSupervisor(now)) {
        return 0;
    }
    const auto enabled = isEnabled(daemon);
    if (!enabled) {
        return -1;
    }
    const std::string name = daemonName(daemon);
    return followedByFirewall(
        noteOutcome(name, *enabled ? startPlanned(daemon) : makeServiceBackend(name)->stop()));
}

ServiceState daemonState(Daemon daemon) {
    return makeServiceBackend(daemonName(daemon))->state();
}

} // namespace velt
