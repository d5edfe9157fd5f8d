// Files that are read whole, and files that are whole at every moment.
#ifndef VELT_BASE_FILE_H
#define VELT_BASE_FILE_H

#include "base/result.h"
#include "base/unique_fd.h"

#include <sys/types.h>

#include <cerrno>
#include <filesystem>
#include <optional>
#include <string>
#include <string_view>

namespace velt {

/// "Cannot open /etc/x: Permission denied." for the verb "open" and the error EACCES.
Error cannot(std::string_view verb, const std::filesystem::path& path, int error = errno,
             SourcePlace where = SourcePlace::current());

/// The whole file.
Result<std::string> readFile(const std::filesystem::path& path);

/// The whole file; nothing when there is none.
Result<std::optional<std::string>> readOptionalFile(const std::filesystem::path& path);

/// Replaces the file by one with `contents`: temporary file, fsync, rename, fsync of the folder, which is
/// made when it is missing. After a crash at any moment the old or the new file is there, whole. Thread-safe.
Result<> replaceFile(const std::filesystem::path& path, std::string_view contents, mode_t mode);

/// What comes until the end. Nothing, with errno set, when that fails.
std::optional<std::string> readAll(int descriptor);

/// Writes all of it. False, with errno set, when that fails.
bool writeAll(int descriptor, std::string_view contents);

/// Opens the file with these flags, made with this mode when it is missing, and waits for its lock (flock,
/// exclusive). It still has this name then: a file that was renamed meanwhile is left for the new one. No
/// descriptor, with errno set, when that fails; a symbolic link is refused.
UniqueFd openLocked(const std::filesystem::path& path, int flags, mode_t mode);

/// Whether there is a file or folder; false also when that cannot be told.
bool fileExists(const std::filesystem::path& path);

/// The same; an error when that cannot be told.
Result<bool> isThere(const std::filesystem::path& path);

/// Makes the folder with this mode, and those above it with 0755, where they are missing; durable on return.
Result<> makeFolder(const std::filesystem::path& folder, mode_t mode = 0755);

} // namespace velt

#endif
