#include "standalone/control/open_state.h"

#include "base/file.h"
#include "standalone/core/paths.h"
#include "standalone/core/scratch_folder.h"
#include "standalone/core/state_lock.h"
#include "standalone/core/state_root.h"
#include "standalone/core/systemd.h"
#include "standalone/journal/admin_log.h"
#include "standalone/login/session_mounts.h"
#include "standalone/rules/rule_store.h"
#include "standalone/settings/confinement_settings.h"
#include "standalone/settings/settings.h"

#include <unistd.h>

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

/// Where nothing is there yet of what the first start makes, in this version and in former ones.
Result<bool> isNewServer() {
    for (const auto file : {paths::initialized, paths::ftpSettings, paths::sftpSettings}) {
        VELT_ASSIGN_OR_RETURN(const bool there, isThere(statePath(file)));
        if (there) {
            return false;
        }
    }
    return true;
}

/// Whether the SFTP daemon could confine its sessions. Units of systemd's have the right to mount, whatever
/// this process has; without root's rights nobody asks for it.
bool canConfine() {
    return systemdKeepsSupervisors() || ::geteuid() != 0 || velt_try_session_mounts() == 0;
}

// A server that was installed without this file serves SFTP as it did until its administrator decides. Where
// the daemon could not confine, a new one would not serve SFTP at all.
Result<> confineNewServer() {
    VELT_ASSIGN_OR_RETURN(const auto lock, StateLock::take());
    VELT_ASSIGN_OR_RETURN(const bool isNew, isNewServer());
    VELT_ASSIGN_OR_RETURN(const bool decided, isThere(statePath(paths::confinementSettings)));
    return isNew && !decided ? storeConfinementSettings({.sftp = canConfine()}) : Result<>();
}

} // namespace

Result<> openState(const std::filesystem::path& root) {
    setStateRoot(root);
    sweepScratchFolders();
    VELT_RETURN_IF_ERROR(confineNewServer());
    VELT_RETURN_IF_ERROR(writeMissingSettings());
    return makeFirstRules();
}

} // namespace velt
