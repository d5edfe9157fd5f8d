// The keys by which the SFTP service proves who it is.
#ifndef VELT_STANDALONE_DAEMONS_SSHD_HOST_KEYS_H
#define VELT_STANDALONE_DAEMONS_SSHD_HOST_KEYS_H

#include "base/result.h"

#include <filesystem>
#include <memory>
#include <vector>

namespace velt {

class ScratchFolder;

struct HostKeys {
    std::vector<std::filesystem::path> files;       ///< the private halves, Ed25519 and RSA
    std::shared_ptr<const ScratchFolder> throwAway; ///< holds the files when they are for a test only
};

/// The host keys below "/var/lib/velt/ssh" of the state root; a missing one is made. Where the thread's hook
/// leaves the store of them undone, throw-away ones that are gone with the result. They are not the keys of
/// another SSH service on this server. Thread-safe.
Result<HostKeys> hostKeys();

} // namespace velt

#endif
