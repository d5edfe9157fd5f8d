// Waiting for the lock of a file, though not for ever.
#ifndef VELT_STANDALONE_CORE_FILE_LOCK_H
#define VELT_STANDALONE_CORE_FILE_LOCK_H

#include <chrono>
#include <filesystem>

namespace velt {

/// Longer than any holder works, a daemon's start among them; past it somebody hangs, and saying so is better
/// than hanging as well.
inline constexpr std::chrono::seconds longestLockWait{60};

/// Locks the opened file for this one alone (flock). Negative when it cannot be had within the limit, with
/// the last error naming `path`.
int waitForFileLock(int descriptor, const std::filesystem::path& path,
                    std::chrono::milliseconds limit = longestLockWait);

} // namespace velt

#endif
