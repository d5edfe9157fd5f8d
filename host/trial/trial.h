// veltd trial: a veltd for one folder, which holds all of its state and a demo share.
#ifndef VELT_HOST_TRIAL_TRIAL_H
#define VELT_HOST_TRIAL_TRIAL_H

#include <string>
#include <vector>

namespace velt::host {

/// Runs "veltd trial" with the words that follow: "start FOLDER" or "stop FOLDER". Returns the exit status.
int runTrial(const std::vector<std::string>& words);

} // namespace velt::host

#endif
