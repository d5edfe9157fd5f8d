// Whether and how long it is kept what sessions did.
#ifndef VELT_STANDALONE_ACTIVITY_ACTIVITY_SETTINGS_H
#define VELT_STANDALONE_ACTIVITY_ACTIVITY_SETTINGS_H

#include "base/result.h"
#include "standalone/activity/operation_store.h"

namespace velt {

struct ActivitySettings {
    bool record = true; ///< sessions that begin from now on write down what they do
    OperationLimits limits;
    bool xferlog = false; ///< transfers are written into a file of that form, too
    bool syslog = false;  ///< and each record into the system's log
};

/// The settings of the file
///
///     version = 1
///     record = 1
///     max_age_days = 90
///     max_size_mb = 1000
///     xferlog = 0
///     syslog = 0
///
/// in which each key may be left out, and a limit of 0 is none; or the defaults without a file. Thread-safe.
Result<ActivitySettings> loadActivitySettings();

} // namespace velt

#endif
