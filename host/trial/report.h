// How to use a trial.
#ifndef VELT_HOST_TRIAL_REPORT_H
#define VELT_HOST_TRIAL_REPORT_H

#include <string>

namespace velt::host {

/// Prints where everything is and what to try, and to standard error what does not work. The working folder
/// is the opened state root, and `folder` its name, with a slash. Throws TrialError.
void report(const std::string& folder, const std::string& url, const std::string& token);

} // namespace velt::host

#endif
