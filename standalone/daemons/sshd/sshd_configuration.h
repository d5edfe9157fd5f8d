// The text of the SFTP daemon's configuration.
#ifndef VELT_STANDALONE_DAEMONS_SSHD_SSHD_CONFIGURATION_H
#define VELT_STANDALONE_DAEMONS_SSHD_SSHD_CONFIGURATION_H

#include "standalone/settings/settings.h"

#include <filesystem>
#include <string>
#include <vector>

namespace velt {

struct SshdPlaces {
    std::vector<std::filesystem::path> hostKeys; ///< absolute, without quotes, control characters and '%'
    std::filesystem::path keysProgram;           ///< velt-authorized-keys, absolute, as above
    std::filesystem::path state;                 ///< the state root, as above
    std::string ownUser;                         ///< the user of this process, a plain name
    bool privileged = true;    ///< else the daemon serves its own user alone, with keys and without passwords
    bool loopbackOnly = false; ///< clients of this machine only, over IPv4
    std::filesystem::path sessionRoot{}; ///< becomes the root directory of sessions; "" where they keep the
                                         ///< server's
};

/// The settings of FTP that count here, too.
struct SharedSettings {
    bool umask = true; ///< 022, else none
    bool fipsOnly = false;
};

/// The whole configuration: file transfer and nothing else. The settings have passed checkSftpSettings. A
/// pure function.
std::string renderSshd(const SftpSettings& settings, const SharedSettings& shared, const SshdPlaces& places);

} // namespace velt

#endif
