#include "standalone/control/open_state.h"

#include "standalone/core/scratch_folder.h"
#include "standalone/core/state_root.h"
#include "standalone/journal/admin_log.h"
#include "standalone/rules/rule_store.h"
#include "standalone/settings/settings.h"

namespace velt {

namespace {

/// FTP that is on was started before, and its start made the file in former versions.
bool mayHaveHadRules() {
    const auto ftp = loadFtpSettings();
    return !ftp || enablesFtp(ftp->record);
}

// A file that is lost later has to be missed: an empty one in its place would free everybody.
Result<> makeFirstRules() {
    VELT_ASSIGN_OR_RETURN(const bool expected, areRulesExpected());
    if (expected) {
        return {};
    }
    if (!mayHaveHadRules()) {
        VELT_RETURN_IF_ERROR(makeRulesFile());
    }
    (void)queryLog({}); // makes the log, too, before it can be missed
    return expectRules();
}

} // namespace

Result<> openState(const std::filesystem::path& root) {
    setStateRoot(root);
    sweepScratchFolders();
    VELT_RETURN_IF_ERROR(writeMissingSettings());
    return makeFirstRules();
}

} // namespace velt
