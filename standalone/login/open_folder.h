// Opening folders whose paths the user who logs in may be able to change.
#ifndef VELT_STANDALONE_LOGIN_OPEN_FOLDER_H
#define VELT_STANDALONE_LOGIN_OPEN_FOLDER_H

#include "base/result.h"
#include "base/unique_fd.h"
#include "standalone/shares/access.h"

#include <filesystem>

namespace velt {

// The descriptors only refer to the folders (O_PATH).

struct OpenedFolder {
    UniqueFd fd;
    std::filesystem::path place; ///< see placeOf
};

/// With root's rights; follows symbolic links. For folders of the system's own.
Result<UniqueFd> openFolder(const std::filesystem::path& path);

/// How far an absolute path leads.
struct Walk {
    UniqueFd folder;            ///< the last one on the way
    std::filesystem::path rest; ///< what is left of the path, links replaced; "" when the walk got to its end
    Result<> ended;             ///< why it did not
    bool lost = false;          ///< where it ended could not be looked at: it may lead anywhere
};

/// Follows only symbolic links in folders that root owns and nobody else may change: anybody who may write to
/// a folder may put a link there, and so name another place.
Walk walk(const std::filesystem::path& path);

/// The end of such a walk, with the user's rights. An error for "/", the whole server.
Result<OpenedFolder> openFolderAs(const Identity& user, const std::filesystem::path& path);

/// What the file system lets the user do with the folder: read when it can be reached, listed and entered,
/// write when files can be made in it, too. Follows links as the user would. An error when it cannot be
/// asked.
Result<Access> accessTo(const Identity& user, const std::filesystem::path& path);

/// With the user's rights, and never outside `folder`, even while folders and links are being moved. `path`
/// is relative and not empty.
Result<OpenedFolder> openFolderBelow(const Identity& user, const UniqueFd& folder,
                                     const std::filesystem::path& path);

/// With root's rights; an error when `path` leads through a symbolic link.
Result<UniqueFd> openFolderExactly(const UniqueFd& folder, const std::filesystem::path& path);

/// The path of an open folder, without links. An error when the folder has been removed or moved.
Result<std::filesystem::path> placeOf(const UniqueFd& folder);

} // namespace velt

#endif
