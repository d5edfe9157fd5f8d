#include "base/file.h"
#include "standalone/core/installed_files.h"
#include "standalone/daemons/daemon.h"
#include "standalone/health/checks.h"
#include "standalone/health/mends.h"
#include "standalone/settings/confinement_settings.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <cstring>
#include <optional>

namespace velt {
namespace {

/// A file of ours that a daemon needs while it runs.
struct Part {
    std::string_view service; ///< the daemon's name in the API
    const char* file;
    int use; ///< X_OK: it is run; R_OK: it is read
    const char* consequence;
    bool confines = false; ///< needed only where SFTP is confined
};

constexpr std::array<Part, 7> parts{{
    {"ftp", "velt-login-view", X_OK, "Nobody can log in over FTP."},
    {"ftp", "mod_velt_login.so", R_OK, "FTP cannot be started again."},
    {"ftp", "velt-supervise", X_OK, "FTP cannot be started again."},
    {"sftp", "velt-authorized-keys", X_OK, "Nobody can log in over SFTP with a key."},
    {"sftp", "velt-login-view", X_OK, "Nobody can log in over SFTP while it is confined.", true},
    {"sftp", "velt-sftp-session.so", R_OK, "SFTP cannot be started again while it is confined.", true},
    {"sftp", "velt-supervise", X_OK, "SFTP cannot be started again."},
}};

constexpr mode_t runnable = 0755;
constexpr mode_t readable = 0644;
constexpr const char* installAgain = "Install this system again, then run: veltctl doctor";

Finding unusable(const Part& part, const std::string& sentence, std::string mend) {
    return {"program-unusable", Severity::error, std::string(part.service), sentence + " " + part.consequence,
            std::move(mend)};
}

std::optional<Finding> judge(const Part& part) {
    const std::filesystem::path path = installedFile(part.file);
    const std::string name = path.string();
    struct stat facts {};
    if (::stat(path.c_str(), &facts) != 0) {
        const int reason = errno;
        return unusable(part,
                        reason == ENOENT ? name + " is missing."
                                         : "Cannot look at " + name + ": " + std::strerror(reason) + ".",
                        installAgain);
    }
    const bool isRun = part.use == X_OK;
    if (!S_ISREG(facts.st_mode)) {
        return unusable(part, name + " is not a file.", installAgain);
    }
    if (::faccessat(AT_FDCWD, path.c_str(), part.use, AT_EACCESS) == 0) {
        return std::nullopt;
    }
    const std::string what =
        name + (isRun ? " cannot be run: " : " cannot be read: ") + std::strerror(errno) + ".";
    const mode_t wanted = isRun ? runnable : readable;
    const bool byMode = (facts.st_mode & wanted) != wanted;
    return unusable(part, what,
                    byMode ? std::string("chmod ") + (isRun ? "755 " : "644 ") + shellWord(name)
                           : "See why with: namei -l " + shellWord(name) + "; findmnt -T " + shellWord(name));
}

bool isSwitchedOn(std::string_view service) {
    const auto daemons = allDaemons();
    const auto row = std::ranges::find(daemons, service, [](const Daemon* each) { return each->apiName; });
    const auto settings = (*row)->settings();
    return settings && settings->enabled();
}

bool sftpIsConfined() {
    const auto settings = loadConfinementSettings();
    return settings && settings->sftp && ::geteuid() == 0;
}

} // namespace

Findings programFindings() {
    Findings findings;
    for (const Part& part : parts) {
        if (isSwitchedOn(part.service) && (!part.confines || sftpIsConfined())) {
            if (auto found = judge(part)) {
                findings.push_back(std::move(*found));
            }
        }
    }
    return findings;
}

} // namespace velt
