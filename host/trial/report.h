// Says where everything of a trial is.
#ifndef VELT_HOST_TRIAL_REPORT_H
#define VELT_HOST_TRIAL_REPORT_H

#include "host/trial/veltd_client.h"

#include <string>

namespace velt::host {

/// Prints where everything is and what to try, and to standard error what does not work. `folder` is the name
/// of the trial's folder, with a slash. Throws TrialError.
void report(const VeltdClient& client, const std::string& folder, const std::string& url,
            const std::string& token);

} // namespace velt::host

#endif
