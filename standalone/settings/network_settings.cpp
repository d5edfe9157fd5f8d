#include "standalone/settings/network_settings.h"

#include "standalone/core/paths.h"
#include "standalone/core/state_root.h"
#include "standalone/core/strict_file.h"

namespace velt {

Result<NetworkSettings> loadNetworkSettings() {
    Result<StrictFile> file = StrictFile::load(statePath(paths::networkSettings));
    if (!file) {
        return file.error();
    }
    NetworkSettings settings;
    settings.loopbackOnly = file->boolean("loopback_only", settings.loopbackOnly);
    if (Result<> done = file->finish(); !done) {
        return done.error();
    }
    return settings;
}

} // namespace velt
