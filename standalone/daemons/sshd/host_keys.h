// The keys by which the SFTP service proves who it is.
#ifndef VELT_STANDALONE_DAEMONS_SSHD_HOST_KEYS_H
#define VELT_STANDALONE_DAEMONS_SSHD_HOST_KEYS_H

#include <filesystem>
#include <optional>
#include <vector>

namespace velt {

/// The private host keys, Ed25519 and RSA, below "/var/lib/velt/ssh" of the state root; a missing one is
/// made. Where the thread's hook leaves the store of them undone, throw-away ones that last until the
/// thread's next call or its end. They are not those of an SSH service that the server may run besides.
/// Nothing, with the last error set, when a key cannot be made. Thread-safe.
std::optional<std::vector<std::filesystem::path>> hostKeys();

} // namespace velt

#endif
