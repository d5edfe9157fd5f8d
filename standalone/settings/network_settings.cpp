#include "standalone/settings/network_settings.h"

#include "standalone/core/file_store.h"
#include "standalone/core/last_error.h"
#include "standalone/core/paths.h"
#include "standalone/core/state_root.h"
#include "standalone/settings/settings_text.h"

#include <cerrno>
#include <cstring>

namespace velt {
namespace {

constexpr int newestVersion = 1;

} // namespace

std::optional<NetworkSettings> loadNetworkSettings() {
    const auto file = statePath(paths::networkSettings);
    const auto text = readFile(file);
    if (!text && errno == ENOENT) {
        return NetworkSettings{};
    }
    if (!text) {
        fail(ErrorNumber::store,
             "Cannot read the settings file " + file.string() + ": " + std::strerror(errno) + ".");
        return std::nullopt;
    }
    SettingsReader reader(file.string(), *text, newestVersion);
    NetworkSettings settings;
    settings.loopbackOnly = reader.boolean("loopback_only");
    return reader.finish() ? std::optional(settings) : std::nullopt;
}

} // namespace velt
