// Taking a state root into use.
#ifndef VELT_STANDALONE_CONTROL_OPEN_STATE_H
#define VELT_STANDALONE_CONTROL_OPEN_STATE_H

#include "base/result.h"

#include <filesystem>

namespace velt {

/// Chooses the root folder of all stored state ("/" in production), and writes the default settings where
/// there are none yet: both services off, and SFTP confined unless this is a server of a former version or
/// cannot do that. The first time it makes an empty file of chroot rules as well, unless FTP is on. What is
/// there already stays, also when it is damaged: that shows when it is read. To be called once, before any
/// other operation of the library and while the process has one thread only.
Result<> openState(const std::filesystem::path& root);

} // namespace velt

#endif
