// Changing the stored settings: nothing is stored that a daemon would refuse.
#ifndef VELT_STANDALONE_CONTROL_CHANGE_SETTINGS_H
#define VELT_STANDALONE_CONTROL_CHANGE_SETTINGS_H

#include "standalone/settings/settings.h"

#include <functional>
#include <string>

namespace velt {

/// Reads the settings, lets `change` change them, and stores them after the checks here and the daemon's own
/// test have passed, all under the StateLock. Settings of a service that is off are not put to the daemon: it
/// may be what is broken. Negative on failure, with the last error set; nothing is stored then.
int changeFtpSettings(const std::function<void(FtpSettings&)>& change);
int changeSftpSettings(const std::function<void(SftpSettings&)>& change);

/// Stores the external address in the same manner.
int changeExternalAddress(const std::string& address);

} // namespace velt

#endif
