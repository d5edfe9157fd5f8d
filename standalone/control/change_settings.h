// Changing the stored settings: nothing is stored that a daemon would refuse.
#ifndef VELT_STANDALONE_CONTROL_CHANGE_SETTINGS_H
#define VELT_STANDALONE_CONTROL_CHANGE_SETTINGS_H

#include "base/result.h"
#include "standalone/settings/settings.h"

#include <functional>
#include <string>

namespace velt {

/// Reads the settings, lets `change` change them, and stores them after they have passed the platform's
/// checks and the daemon's own test, all under the StateLock. Settings of a service that is off are not put
/// to the daemon: it may be what is broken. After an error nothing is stored.
Result<> changeFtpSettings(const std::function<void(FtpSettings&)>& change);
Result<> changeSftpSettings(const std::function<void(SftpSettings&)>& change);

/// Stores the external address in the same way; one that checkExternalAddress refuses is none.
Result<> changeExternalAddress(const std::string& address);

} // namespace velt

#endif
