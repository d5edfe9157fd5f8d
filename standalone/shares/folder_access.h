// What the file system allows an account on a folder.
#ifndef VELT_STANDALONE_SHARES_FOLDER_ACCESS_H
#define VELT_STANDALONE_SHARES_FOLDER_ACCESS_H

#include "base/result.h"
#include "standalone/shares/access.h"

#include <string>

namespace velt {

/// Asks the kernel, in a child process that takes this identity, so that modes, access control lists and
/// read-only mounts all count, on the way to the folder, too. Read: the folder can be reached, listed and
/// entered; write: files can be made in it as well. Only root can ask for another account. Thread-safe.
Result<Access> folderAccess(const std::string& path, const Identity& who);

} // namespace velt

#endif
