// What the SFTP daemon needs so that its sessions see what FTP's do.
#ifndef VELT_STANDALONE_DAEMONS_SSHD_CONFINEMENT_H
#define VELT_STANDALONE_DAEMONS_SSHD_CONFINEMENT_H

#include "base/result.h"
#include "standalone/settings/confinement_settings.h"

#include <filesystem>
#include <string>
#include <vector>

namespace velt {

struct Confinement {
    std::filesystem::path root; ///< the daemon's ChrootDirectory; "" where sessions are not confined
    std::vector<std::string> environment; ///< of the daemon: "NAME=VALUE"
};

/// As the settings have it. None without root's rights, of which the system's log tells: the daemon serves
/// its own user alone then. Thread-safe.
Result<Confinement> prepareConfinement(const ConfinementSettings& settings);

/// Our own files with which a session is confined, and what of OpenSSH serves a connection.
std::vector<std::filesystem::path> filesOfConfinement();

/// Fails where OpenSSH changes files in a way of which our library knows nothing: sessions could change there
/// what they may not.
Result<> checkCoverage();

} // namespace velt

#endif
