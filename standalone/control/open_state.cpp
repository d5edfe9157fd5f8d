#include "standalone/control/open_state.h"

#include "standalone/core/boundary.h"
#include "standalone/core/state_root.h"
#include "standalone/daemons/configuration_test.h"
#include "standalone/settings/settings.h"

namespace velt {

int openState(const std::filesystem::path& root) {
    return atBoundary([&] {
        setStateRoot(root);
        const Result<> result = writeMissingSettings();
        sweepScratchFolders();
        return result;
    });
}

} // namespace velt
