#include "standalone/installed_files.h"

#include <cstdlib>

namespace velt {

std::filesystem::path installedFile(std::string_view name) {
    const char* folder = std::getenv("VELT_LIBEXEC_DIR");
    return std::filesystem::path(folder != nullptr && *folder != '\0' ? folder : VELT_LIBEXEC_FOLDER) / name;
}

} // namespace velt
