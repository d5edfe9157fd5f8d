#include "standalone/settings/network_settings.h"

#include "standalone/core/paths.h"
#include "standalone/core/state_root.h"
#include "standalone/core/strict_file.h"

namespace velt {

Result<NetworkSettings> loadNetworkSettings() {
    VELT_ASSIGN_OR_RETURN(StrictFile file, StrictFile::load(statePath(paths::networkSettings)));
    NetworkSettings settings;
    settings.loopbackOnly = file.boolean("loopback_only", settings.loopbackOnly);
    VELT_RETURN_IF_ERROR(file.finish());
    return settings;
}

} // namespace velt
