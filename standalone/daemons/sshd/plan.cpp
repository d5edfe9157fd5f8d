#include "base/file.h"
#include "base/sha256.h"
#include "standalone/core/boundary.h"
#include "standalone/core/last_error.h"
#include "standalone/core/paths.h"
#include "standalone/core/state_lock.h"
#include "standalone/core/state_root.h"
#include "standalone/daemons/candidate.h"
#include "standalone/daemons/configuration_test.h"
#include "standalone/daemons/daemon_plan.h"
#include "standalone/daemons/proftpd/render.h"
#include "standalone/daemons/sshd/host_keys.h"
#include "standalone/daemons/sshd/render.h"
#include "standalone/settings/network_settings.h"

#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>

namespace velt {
namespace {

// The daemon starts itself anew for each connection and needs its absolute path for that.
constexpr const char* program = "/usr/sbin/sshd";

// The daemon has this place built in, so it does not follow the state root; nothing but its being there
// counts.
int makeSeparationFolder() {
    if (geteuid() != 0 || mkdir("/run/sshd", 0755) == 0 || errno == EEXIST) {
        return 0;
    }
    return fail(ErrorNumber::daemon,
                std::string("The folder /run/sshd cannot be made: ") + std::strerror(errno) + ".");
}

std::optional<std::string> rendering(const SftpSettings& settings) {
    const auto keys = makeSeparationFolder() < 0 ? std::nullopt : hostKeys();
    if (!keys) {
        return std::nullopt;
    }
    if (!isRenderable(keys->front())) {
        fail(ErrorNumber::invalid, "The folder " + statePath("/").string() +
                                       " has a name that the SFTP daemon's configuration cannot hold.");
        return std::nullopt;
    }
    const auto network = orLastError(loadNetworkSettings());
    if (!network) {
        return std::nullopt;
    }
    return renderSshd(settings, {*keys, geteuid() == 0, network->loopbackOnly});
}

int testRendering(const std::string& text) {
    const ScratchFolder scratch;
    const auto configuration = scratch.path() / "sshd_config";
    if (!scratch || toContract(replaceFile(configuration, text, 0600)) < 0) {
        return -1;
    }
    return runDaemonTest("SFTP", {program, "-t", "-f", configuration.string()});
}

} // namespace

int testSftpCandidate(const SftpSettings& settings) {
    const auto text = rendering(settings);
    return text ? testRendering(*text) : -1;
}

std::optional<DaemonPlan> planSftpDaemon() {
    const StateLock lock;
    const auto settings = lock ? orLastError(loadSftpSettings()) : std::nullopt;
    if (!settings || toContract(checkSftpSettings(*settings)) < 0) {
        return std::nullopt;
    }
    const auto text = rendering(*settings);
    if (!text || testRendering(*text) < 0) {
        return std::nullopt;
    }
    DaemonPlan plan;
    plan.configurationHash = sha256(*text);
    plan.folder = statePath(paths::sftpConfigurations) / plan.configurationHash;
    const auto configuration = plan.folder / "sshd_config";
    if (toContract(replaceFile(configuration, *text, 0600)) < 0) {
        return std::nullopt;
    }
    plan.arguments = {program, "-D", "-e", "-f", configuration.string()};
    plan.executable = program;
    plan.listenPorts = {settings->port};
    return plan;
}

} // namespace velt
