// Files that are whole at every moment.
#ifndef VELT_STANDALONE_CORE_FILE_STORE_H
#define VELT_STANDALONE_CORE_FILE_STORE_H

#include <sys/types.h>

#include <filesystem>
#include <optional>
#include <string>
#include <string_view>

namespace velt {

/// Replaces the file by one with `contents`: temporary file, fsync, rename, fsync of the folder, which is
/// made when it is missing. After a crash at any moment the old or the new file stands there, whole. Negative
/// on failure, with the last error set.
int replaceFile(const std::filesystem::path& path, std::string_view contents, mode_t mode);

/// The whole file; nothing when it cannot be read (errno says why, ENOENT when there is none).
std::optional<std::string> readFile(const std::filesystem::path& path);

/// Whether the path leads to the opened file, and not to a link or to a file that took its place.
bool isSameFile(int descriptor, const std::filesystem::path& path);

} // namespace velt

#endif
