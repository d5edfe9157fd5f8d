// Waiting for the lock of a file, with a limit.
#ifndef VELT_BASE_FILE_LOCK_H
#define VELT_BASE_FILE_LOCK_H

#include "base/result.h"

#include <chrono>
#include <filesystem>

namespace velt {

/// Longer than anybody works while holding a lock, a daemon's start included; after that the holder hangs,
/// and saying so is better than hanging as well.
inline constexpr std::chrono::seconds longestLockWait{60};

/// Locks the opened file (flock, exclusive), waiting for `limit` at most. `path` names it in the error.
Result<> waitForFileLock(int descriptor, const std::filesystem::path& path,
                         std::chrono::milliseconds limit = longestLockWait);

} // namespace velt

#endif
