// What the file system allows an account on a folder.
#ifndef VELT_STANDALONE_SHARES_FOLDER_ACCESS_H
#define VELT_STANDALONE_SHARES_FOLDER_ACCESS_H

#include "base/result.h"
#include "standalone/shares/access.h"

#include <string>

namespace velt {

/// Asks the kernel, in a child process with this identity, so that modes, access control lists and read-only
/// mounts all count, for the folders on the way as well, as the services see them. Read: the folder can be
/// reached, listed and entered. Write: files can be made in it, too. Only root can ask for another account.
/// Thread-safe.
Result<Access> folderAccess(const std::string& path, const Identity& who);

} // namespace velt

#endif
