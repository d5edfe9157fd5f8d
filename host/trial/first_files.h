// What a trial's veltd finds at its first start.
#ifndef VELT_HOST_TRIAL_FIRST_FILES_H
#define VELT_HOST_TRIAL_FIRST_FILES_H

#include <filesystem>

namespace velt::host {

/// Makes, in the working folder, a network of this machine alone, and the demo share with somebody who may
/// write to it: anonymous users, or without root's rights a user demo of the FTP service's own files. `place`
/// is the working folder as veltd sees it. Does nothing when they are all there. Throws TrialError.
void makeFirstFiles(const std::filesystem::path& place);

} // namespace velt::host

#endif
