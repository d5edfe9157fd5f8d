// Files that decide what somebody may do.
#ifndef VELT_BASE_TRUSTED_FILE_H
#define VELT_BASE_TRUSTED_FILE_H

#include "base/result.h"

#include <filesystem>
#include <string>

namespace velt {

/// The whole file. It must be a regular file of at most 16 MiB that belongs to root or to this process's
/// user, and that nobody else may write. A missing one is an error.
Result<std::string> readTrusted(const std::filesystem::path& path);

} // namespace velt

#endif
