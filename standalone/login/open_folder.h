// Opening folders of which parts may be under the control of the one who logs in.
#ifndef VELT_STANDALONE_LOGIN_OPEN_FOLDER_H
#define VELT_STANDALONE_LOGIN_OPEN_FOLDER_H

#include "base/unique_fd.h"
#include "standalone/login/login.h"

#include <filesystem>
#include <string>

namespace velt {

/// Each opens for the use of the folder as such (O_PATH). An empty owner, with errno set, on failure.

/// With root's rights and through all symbolic links.
UniqueFd openFolder(const std::filesystem::path& path);

/// With the rights of the login, for a path that the login may have laid itself: a home, or a share within
/// one that the login may write.
UniqueFd openFolderAs(const Login& login, const std::filesystem::path& path);

/// With the rights of the login, and never outside of `folder`, whoever moves folders and links meanwhile.
/// `path` is relative and not empty.
UniqueFd openFolderBelow(const Login& login, const UniqueFd& folder, const std::filesystem::path& path);

/// With root's rights, `path` as it is, which must not lead through a symbolic link.
UniqueFd openFolderExactly(const UniqueFd& folder, const std::filesystem::path& path);

/// Where an open folder lies, free of links; "" when that cannot be told.
std::filesystem::path placeOf(const UniqueFd& folder);

} // namespace velt

#endif
