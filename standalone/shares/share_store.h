// The shares of this server: "/etc/velt/shares.json" below the state root.
#ifndef VELT_STANDALONE_SHARES_SHARE_STORE_H
#define VELT_STANDALONE_SHARES_SHARE_STORE_H

#include "standalone/shares/share_entry.h"

#include <vector>

namespace velt {

/// The stored shares in their order; none without the file. Thread-safe.
Result<std::vector<ShareEntry>> loadShares();

} // namespace velt

#endif
