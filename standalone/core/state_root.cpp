#include "standalone/core/state_root.h"

#include <cstdlib>

namespace velt {

namespace {

std::filesystem::path rootFromEnvironment() {
    const char* root = std::getenv("VELT_STATE_ROOT");
    return root != nullptr && *root != '\0' ? std::filesystem::absolute(root) : std::filesystem::path("/");
}

std::filesystem::path& stateRoot() {
    static std::filesystem::path root = rootFromEnvironment();
    return root;
}

} // namespace

void setStateRoot(const std::filesystem::path& root) {
    stateRoot() = std::filesystem::absolute(root);
}

std::filesystem::path statePath(std::string_view absolutePath) {
    // Normalised as an absolute path, ".." ends at the root and cannot lead out of it.
    const auto inside = (std::filesystem::path("/") / absolutePath).lexically_normal();
    return stateRoot() / inside.relative_path();
}

} // namespace velt
