// Files that are read whole, and files that are whole at every moment.
#ifndef VELT_BASE_FILE_H
#define VELT_BASE_FILE_H

#include "base/result.h"

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

/// Writes all of it. False, with errno set, when that fails.
bool writeAll(int descriptor, std::string_view contents);

/// Whether the path leads to the opened file, and not to a link or to a file that took its place.
bool isSameFile(int descriptor, const std::filesystem::path& path);

} // namespace velt

#endif
