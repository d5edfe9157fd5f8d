// Starting what is enabled, and stopping everything.
#ifndef VELT_STANDALONE_CONTROL_START_SERVICES_H
#define VELT_STANDALONE_CONTROL_START_SERVICES_H

#include "base/result.h"

namespace velt {

/// Makes the daemons follow the stored settings after a boot: starts what is enabled, ends what is not.
/// Blocks until each daemon accepts connections or has failed. One that fails does not keep the others from
/// starting; each failure goes to syslog, and the first one is returned.
Result<> startEnabledServices();

/// Ends the daemons and their sessions. The settings stay as they are stored, so that startEnabledServices
/// starts the same ones again. Failures are treated in the same way.
Result<> stopServices();

} // namespace velt

#endif
