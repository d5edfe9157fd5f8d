#include "standalone/control/change_confinement.h"

#include "standalone/control/follow_with_sftp.h"
#include "standalone/core/state_lock.h"
#include "standalone/daemons/sshd/sshd_plan.h"
#include "standalone/settings/settings.h"

namespace velt {
namespace {

/// As with the settings of the services themselves: those of one that is off can be changed while its daemon
/// is what is broken.
Result<> check(const ConfinementSettings& settings) {
    VELT_ASSIGN_OR_RETURN(const auto sftp, loadSftpSettings());
    if (sftp.enabled) {
        VELT_ASSIGN_OR_RETURN([[maybe_unused]] const auto hash, testSftpCandidate(sftp, settings));
    }
    return {};
}

} // namespace

Result<> changeConfinement(const ConfinementSettings& settings) {
    VELT_ASSIGN_OR_RETURN(const auto lock, StateLock::take());
    VELT_ASSIGN_OR_RETURN(const auto stored, loadConfinementSettings());
    if (settings == stored) {
        return {};
    }
    VELT_RETURN_IF_ERROR(check(settings));
    VELT_RETURN_IF_ERROR(storeConfinementSettings(settings));
    return followWithSftp();
}

} // namespace velt
