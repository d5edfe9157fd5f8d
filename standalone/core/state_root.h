// Where the platform keeps its state: every file is below one root folder, "/" in production.
#ifndef VELT_STANDALONE_CORE_STATE_ROOT_H
#define VELT_STANDALONE_CORE_STATE_ROOT_H

#include <filesystem>
#include <string_view>

namespace velt {

/// Chooses the root folder. To be called before any other operation, or by tests between them; not
/// thread-safe. The environment variable VELT_STATE_ROOT sets it where nobody calls this.
void setStateRoot(const std::filesystem::path& root);

/// The place of one of the files of paths.h below the root.
std::filesystem::path statePath(std::string_view absolutePath);

} // namespace velt

#endif
