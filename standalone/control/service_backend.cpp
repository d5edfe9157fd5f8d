#include "standalone/control/service_backend.h"

#include "standalone/control/supervise_backend.h"
#include "standalone/control/systemd_launcher.h"
#include "standalone/core/last_error.h"
#include "standalone/core/paths.h"
#include "standalone/core/state_root.h"

#include <system_error>

namespace velt {

bool systemdKeepsSupervisors() {
    // Units are the machine's, so an installation below another root keeps its daemons to itself.
    std::error_code error;
    return std::filesystem::is_directory("/run/systemd/system", error) && statePath("/") == "/";
}

std::unique_ptr<ServiceBackend> makeServiceBackend(const std::string& daemon) {
    if (systemdKeepsSupervisors()) {
        return std::make_unique<SuperviseBackend>(daemon, std::make_unique<SystemdLauncher>(daemon));
    }
    return std::make_unique<SuperviseBackend>(daemon);
}

std::filesystem::path runDirectory() {
    std::filesystem::path directory = statePath(paths::run);
    std::error_code error;
    std::filesystem::create_directories(directory, error);
    if (error) {
        fail(ErrorNumber::store,
             "The folder " + directory.string() + " cannot be made: " + error.message() + ".");
        return {};
    }
    return directory;
}

std::string daemonTitle(const std::string& daemon) {
    return daemon == "sftp" ? "The SFTP daemon" : "The FTP daemon";
}

int failedToStart(const std::string& daemon, std::string reason) {
    while (!reason.empty() && (reason.back() == '.' || reason.back() == ' ')) {
        reason.pop_back(); // daemons end their sentences as they like
    }
    return fail(ErrorNumber::daemon, daemonTitle(daemon) + " does not start: " + reason + ".");
}

} // namespace velt
