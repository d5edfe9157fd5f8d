// veltd trial: a veltd of one's own, with all of its state and a demo share below one folder.
#ifndef VELT_HOST_TRIAL_TRIAL_H
#define VELT_HOST_TRIAL_TRIAL_H

#include <string>
#include <vector>

namespace velt::host {

/// Does what the words after "veltd trial" say: "start FOLDER" or "stop FOLDER". Returns the program's exit
/// status.
int runTrial(const std::vector<std::string>& words);

} // namespace velt::host

#endif
