// Doing a staged change, and undoing what was done of it when a step fails.
#ifndef VELT_STANDALONE_CHANGE_RUN_CHANGE_H
#define VELT_STANDALONE_CHANGE_RUN_CHANGE_H

#include "standalone/change/change_program.h"
#include "standalone/core/state_lock.h"

#include <vector>

namespace velt {

/// Whether the firewall will take the ports that the change opens. To be called while it is staged.
Result<> checkPorts(const std::vector<ProgramStep>& program);

/// Does the steps one after the other, and writes down what was held back. Gives the lock up when the files
/// are stored: starts take long, and daemons report failed logins under it. After a failure the files are as
/// they were, and the daemons run as they did; where that fails as well, the failure says so.
ChangeOutcome runChange(const StagedRequest& request, const std::vector<ProgramStep>& program,
                        StateLock lock);

} // namespace velt

#endif
