// Where the platform's own programs and modules are installed.
#ifndef VELT_STANDALONE_CORE_INSTALLED_FILES_H
#define VELT_STANDALONE_CORE_INSTALLED_FILES_H

#include <filesystem>
#include <string_view>

namespace velt {

/// The place of one of the platform's own files ("velt-login-view", "mod_velt_login.so"): in the folder that
/// the environment variable VELT_LIBEXEC_DIR names, else where an installation has it, seen from the folder
/// of this library. Whether it is there is not checked.
std::filesystem::path installedFile(std::string_view name);

} // namespace velt

#endif
