#include "standalone/control/open_state.h"

#include "standalone/core/scratch_folder.h"
#include "standalone/core/state_root.h"
#include "standalone/settings/settings.h"

namespace velt {

Result<> openState(const std::filesystem::path& root) {
    setStateRoot(root);
    sweepScratchFolders();
    return writeMissingSettings();
}

} // namespace velt
