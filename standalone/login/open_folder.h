// Opening folders of which parts may be under the control of the one who logs in.
#ifndef VELT_STANDALONE_LOGIN_OPEN_FOLDER_H
#define VELT_STANDALONE_LOGIN_OPEN_FOLDER_H

#include "base/result.h"
#include "base/unique_fd.h"
#include "standalone/shares/access.h"

#include <filesystem>

namespace velt {

// Each opens for the use of the folder as such (O_PATH).

/// With root's rights and through all symbolic links.
Result<UniqueFd> openFolder(const std::filesystem::path& path);

/// With the rights of the user, for a path that the user may have laid: a home, or a share within one that
/// the user may write.
Result<UniqueFd> openFolderAs(const Identity& user, const std::filesystem::path& path);

/// With the rights of the user, and never outside of `folder`, whoever moves folders and links meanwhile.
/// `path` is relative and not empty.
Result<UniqueFd> openFolderBelow(const Identity& user, const UniqueFd& folder,
                                 const std::filesystem::path& path);

/// With root's rights, `path` as it is, which must not lead through a symbolic link.
Result<UniqueFd> openFolderExactly(const UniqueFd& folder, const std::filesystem::path& path);

/// Where an open folder lies, free of links. An error when it has been removed or moved meanwhile.
Result<std::filesystem::path> placeOf(const UniqueFd& folder);

} // namespace velt

#endif
