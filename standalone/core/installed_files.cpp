#include "standalone/core/installed_files.h"

#include <dlfcn.h>

#include <cstdlib>

namespace velt {
namespace {

// The library's own place leads to the others, so that an installation works below any prefix.
std::filesystem::path libraryFolder() {
    Dl_info library{};
    const auto* here = reinterpret_cast<const void*>(&installedFile);
    if (dladdr(here, &library) == 0 || library.dli_fname == nullptr) {
        return {};
    }
    std::error_code error;
    const auto file = std::filesystem::canonical(library.dli_fname, error);
    return file.parent_path();
}

std::filesystem::path installedFolder() {
    return (libraryFolder() / VELT_HELPERS_FROM_LIBRARIES).lexically_normal();
}

} // namespace

std::filesystem::path installedFile(std::string_view name) {
    const char* folder = std::getenv("VELT_LIBEXEC_DIR");
    if (folder != nullptr && *folder != '\0') {
        return std::filesystem::path(folder) / name;
    }
    // Looked up once, since a program may change its working folder.
    static const std::filesystem::path installed = installedFolder();
    return installed / name;
}

} // namespace velt
