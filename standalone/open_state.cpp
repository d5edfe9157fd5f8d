#include "standalone/core/boundary.h"
#include "standalone/core/state_root.h"
#include "standalone/daemon_test.h"
#include "standalone/settings/settings.h"
#include "standalone/standalone.h"

namespace velt {

int openState(const std::filesystem::path& root) {
    return atBoundary([&] {
        setStateRoot(root);
        const int result = writeMissingSettings();
        sweepScratchFolders();
        return result;
    });
}

} // namespace velt
