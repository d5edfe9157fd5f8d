// Where the platform keeps its state: every file is below one root folder, "/" in production.
#ifndef VELT_STANDALONE_CORE_STATE_ROOT_H
#define VELT_STANDALONE_CORE_STATE_ROOT_H

#include <filesystem>
#include <functional>
#include <map>
#include <string>
#include <string_view>

namespace velt {

/// Chooses the root folder. To be called before any other operation, or by tests between them; not
/// thread-safe. The environment variable VELT_STATE_ROOT sets it where nobody calls this.
void setStateRoot(const std::filesystem::path& root);

/// The place of one of the files of paths.h: below the root, unless this thread has another one for it.
std::filesystem::path statePath(std::string_view absolutePath);

/// The place below the root, whatever other places there are.
std::filesystem::path placeBelowRoot(std::string_view absolutePath);

/// Places of single files, by their names in paths.h.
using OtherPlaces = std::map<std::string, std::filesystem::path, std::less<>>;

/// What this thread has elsewhere; null: nothing. They outlive their use.
void setOtherPlaces(const OtherPlaces* places);

} // namespace velt

#endif
