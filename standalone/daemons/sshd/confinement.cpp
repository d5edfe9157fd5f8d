#include "standalone/daemons/sshd/confinement.h"

#include "base/file.h"
#include "standalone/core/error_number.h"
#include "standalone/core/installed_files.h"
#include "standalone/core/state_root.h"
#include "standalone/daemons/daemon_configuration.h"
#include "standalone/daemons/sshd/uncovered_functions.h"

#include <syslog.h>
#include <unistd.h>

namespace velt {
namespace {

// The daemon takes only a folder that nobody but root could have changed, the whole way down, and has an
// empty one of its own, which is not below the state root. Each session has mounts of its own there. Written
// so, it is not taken for the root directory of a connection before its login.
constexpr const char* sessionRoot = "/run/sshd/.";

std::filesystem::path library() {
    return installedFile("velt-sftp-session.so");
}

/// What serves a connection: the daemon itself, or from OpenSSH 9.8 on a program beside it.
std::vector<std::filesystem::path> sessionPrograms() {
    std::vector<std::filesystem::path> programs{"/usr/sbin/sshd"};
    const std::filesystem::path apart = "/usr/lib/openssh/sshd-session";
    if (fileExists(apart)) {
        programs.push_back(apart);
    }
    return programs;
}

// The loader takes a list in which blanks and colons stand between its parts.
Result<> checkLoadable(const std::filesystem::path& file) {
    VELT_RETURN_IF_ERROR(checkRenderable(file, file.parent_path()));
    if (file.string().find_first_of(" :") != std::string::npos) {
        return Error(ErrorNumber::invalid, "Cannot confine SFTP sessions from the folder " +
                                               file.parent_path().string() +
                                               ": its path may not contain blanks or colons.");
    }
    return {};
}

} // namespace

Result<Confinement> prepareConfinement(const ConfinementSettings& settings) {
    if (!settings.sftp) {
        return Confinement();
    }
    if (::geteuid() != 0) {
        ::syslog(LOG_WARNING, "SFTP sessions are not confined: only root can do that.");
        return Confinement();
    }
    VELT_RETURN_IF_ERROR(checkLoadable(library()));
    return Confinement{sessionRoot,
                       {"LD_PRELOAD=" + library().string(),
                        "VELT_SESSION_PROGRAM=" + installedFile("velt-login-view").string(),
                        "VELT_SESSION_STATE=" + statePath("/").string(),
                        std::string("VELT_SESSION_ROOT=") + sessionRoot}};
}

std::vector<std::filesystem::path> filesOfConfinement() {
    auto files = sessionPrograms();
    files.push_back(library());
    return files;
}

Result<> checkCoverage() {
    VELT_ASSIGN_OR_RETURN(const auto uncovered, uncoveredFunctions(sessionPrograms(), library()));
    if (uncovered.empty()) {
        return {};
    }
    return Error(ErrorNumber::daemon, "This server's OpenSSH changes files by " + uncovered.front() +
                                          "(), which SFTP sessions could use outside of what they may "
                                          "change. Install a version of this system that knows it, or "
                                          "switch the confinement of SFTP off.");
}

} // namespace velt
