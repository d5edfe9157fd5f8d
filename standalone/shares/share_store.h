// The shares of this server: "/etc/velt/shares.json" below the state root.
#ifndef VELT_STANDALONE_SHARES_SHARE_STORE_H
#define VELT_STANDALONE_SHARES_SHARE_STORE_H

#include "standalone/shares/share_entry.h"

#include <vector>

namespace velt {

/// The stored shares in their order; none before the first store. Thread-safe.
Result<std::vector<ShareEntry>> loadShares();

/// Stores these shares in place of the stored ones; FTP logins follow them from the next one on. To change
/// what loadShares returned, hold a StateLock from before that call until after this one. An error leaves the
/// stored shares as they were. Thread-safe.
Result<> storeShares(const std::vector<ShareEntry>& shares);

} // namespace velt

#endif
