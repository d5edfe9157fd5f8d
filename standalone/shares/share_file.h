// The text form of the shares.
#ifndef VELT_STANDALONE_SHARES_SHARE_FILE_H
#define VELT_STANDALONE_SHARES_SHARE_FILE_H

#include "standalone/shares/share_entry.h"

#include <string>
#include <string_view>
#include <vector>

namespace velt {

/// Reads the text of the shares' file: JSON in its strict form, the keys as renderShares writes them, of
/// which "comment", "ftp", "users" and "groups" may be absent. The error of a damaged one names the file and
/// what is wrong in it.
Result<std::vector<ShareEntry>> parseShares(std::string_view text);

/// The text of shares that checkShares has passed.
std::string renderShares(const std::vector<ShareEntry>& shares);

} // namespace velt

#endif
