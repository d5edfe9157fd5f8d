#include "standalone/settings/confinement_settings.h"

#include "base/file.h"
#include "standalone/core/effects.h"
#include "standalone/core/paths.h"
#include "standalone/core/staged_files.h"
#include "standalone/core/state_root.h"
#include "standalone/core/strict_file.h"

#include <string>

namespace velt {
namespace {

constexpr mode_t settingsMode = 0644;

std::string format(const ConfinementSettings& settings) {
    return std::string(
               "version = 1\n"
               "\n"
               "# A login over SFTP sees what the same login over FTP sees (1), or all that Unix modes\n"
               "# let its user reach (0). An edit takes effect when the service starts next.\n"
               "sftp = ") +
           (settings.sftp ? "1\n" : "0\n");
}

} // namespace

Result<ConfinementSettings> loadConfinementSettings() {
    VELT_ASSIGN_OR_RETURN(StrictFile file, StrictFile::load(statePath(paths::confinementSettings)));
    ConfinementSettings settings;
    settings.sftp = file.boolean("sftp", settings.sftp);
    VELT_RETURN_IF_ERROR(file.finish());
    return settings;
}

Result<> storeConfinementSettings(const ConfinementSettings& settings) {
    return perform(Effect::store, "confinement settings", [&]() -> Result<> {
        VELT_ASSIGN_OR_RETURN(const auto place, storePath(paths::confinementSettings));
        return replaceFile(place, format(settings), settingsMode);
    });
}

} // namespace velt
