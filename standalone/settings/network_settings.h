// Where the services may be reached, which an administrator says in a file; the API has no setting for it.
#ifndef VELT_STANDALONE_SETTINGS_NETWORK_SETTINGS_H
#define VELT_STANDALONE_SETTINGS_NETWORK_SETTINGS_H

#include "base/result.h"

namespace velt {

struct NetworkSettings {
    bool loopbackOnly = false; ///< the services listen on 127.0.0.1 and nowhere else
};

/// The settings of /etc/velt/network.conf below the state root, the defaults where there is none:
///
///     version = 1
///     loopback_only = 1
///
/// Thread-safe.
Result<NetworkSettings> loadNetworkSettings();

} // namespace velt

#endif
