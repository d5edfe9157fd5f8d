// What a trial's veltd finds when it starts.
#ifndef VELT_HOST_TRIAL_FIRST_STATE_H
#define VELT_HOST_TRIAL_FIRST_STATE_H

#include <filesystem>

namespace velt::host {

/// Makes the state of a new trial in the working folder, which is the opened state root: a demo share, and
/// settings with free ports that need no privileges. The services listen on the loopback only. As root,
/// anonymous users may write to the share; otherwise a user demo may, from account files of our own. `place`
/// is the working folder as veltd sees it. Can be called again after an interruption. Throws TrialError.
void makeFirstState(const std::filesystem::path& place);

} // namespace velt::host

#endif
