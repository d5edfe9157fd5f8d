#include "standalone/settings/network_settings.h"

#include "standalone/core/last_error.h"
#include "standalone/core/paths.h"
#include "standalone/core/state_root.h"
#include "standalone/core/strict_file.h"

namespace velt {

std::optional<NetworkSettings> loadNetworkSettings() {
    Result<StrictFile> file = StrictFile::load(statePath(paths::networkSettings));
    if (!file) {
        fail(file.error());
        return std::nullopt;
    }
    NetworkSettings settings;
    settings.loopbackOnly = file->boolean("loopback_only", settings.loopbackOnly);
    if (Result<> done = file->finish(); !done) {
        fail(done.error());
        return std::nullopt;
    }
    return settings;
}

} // namespace velt
