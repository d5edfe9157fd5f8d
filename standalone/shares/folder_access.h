// What the file system allows an account on a folder.
#ifndef VELT_STANDALONE_SHARES_FOLDER_ACCESS_H
#define VELT_STANDALONE_SHARES_FOLDER_ACCESS_H

#include <sys/types.h>

#include <optional>
#include <string>
#include <vector>

namespace velt {

struct FolderAccess {
    bool read = false;  ///< the folder can be reached, listed and entered
    bool write = false; ///< and files can be made in it
};

/// Asks the kernel, in a child process that takes this identity, so that modes, access control lists and
/// read-only mounts all count, on the way to the folder, too. `gids` has the primary group first. Nothing,
/// with the last error set, when it cannot be asked: only root can take another's identity. Thread-safe.
std::optional<FolderAccess> folderAccess(const std::string& path, uid_t uid, const std::vector<gid_t>& gids);

} // namespace velt

#endif
