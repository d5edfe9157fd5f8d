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

const OtherPlaces*& otherPlaces() {
    thread_local const OtherPlaces* places = nullptr;
    return places;
}

} // namespace

void setStateRoot(const std::filesystem::path& root) {
    stateRoot() = std::filesystem::absolute(root);
}

std::filesystem::path statePath(std::string_view absolutePath) {
    if (const OtherPlaces* const others = otherPlaces()) {
        if (const auto found = others->find(absolutePath); found != others->end())
            return found->second;
    }
    return placeBelowRoot(absolutePath);
}

std::filesystem::path placeBelowRoot(std::string_view absolutePath) {
    // Normalised as an absolute path, ".." ends at the root and cannot lead out of it.
    const auto inside = (std::filesystem::path("/") / absolutePath).lexically_normal();
    return stateRoot() / inside.relative_path();
}

void setOtherPlaces(const OtherPlaces* places) {
    otherPlaces() = places;
}

} // namespace velt
