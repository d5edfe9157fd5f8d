// The files that a trial's veltd finds at its first start.
#ifndef VELT_HOST_TRIAL_FIRST_FILES_H
#define VELT_HOST_TRIAL_FIRST_FILES_H

#include <filesystem>

namespace velt::host {

/// Makes them in the working folder: the services listen on the loopback only, and there is a demo share to
/// which anonymous users may write or, without root's rights, a user demo from account files of our own.
/// `place` is the working folder as veltd sees it. Does nothing when the files exist. Throws TrialError.
void makeFirstFiles(const std::filesystem::path& place);

} // namespace velt::host

#endif
