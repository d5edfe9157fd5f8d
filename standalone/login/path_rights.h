// Why the file system lets a user do something with a file or folder, or not.
#ifndef VELT_STANDALONE_LOGIN_PATH_RIGHTS_H
#define VELT_STANDALONE_LOGIN_PATH_RIGHTS_H

#include "base/result.h"
#include "standalone/shares/access.h"

#include <filesystem>
#include <string>

namespace velt {

struct PathRights {
    std::filesystem::path place;  ///< without links
    Access access = Access::none; ///< as the kernel says; reading a folder is listing and entering it
    std::string reason;           ///< one sentence: what decides
};

/// Asks the kernel for this user about each folder on the way and about what stands there, modes, access
/// control lists and read-only mounts included. The path is absolute. An error when nothing stands there, or
/// it cannot be looked at. For processes of one thread that run as root.
Result<PathRights> rightsOn(const Identity& user, const std::filesystem::path& path);

} // namespace velt

#endif
