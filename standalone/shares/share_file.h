// The text form of the shares.
#ifndef VELT_STANDALONE_SHARES_SHARE_FILE_H
#define VELT_STANDALONE_SHARES_SHARE_FILE_H

#include "standalone/shares/share_store.h"

#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace velt {

/// Why these cannot be the shares of a server, in words that follow a colon ("share 2 (\"a/b\") ...");
/// nothing when they can.
std::optional<std::string> flawOf(const std::vector<ShareEntry>& shares);

/// Reads the file's text: JSON in its strict form, the keys as renderShares writes them, of which "comment",
/// "ftp", "users" and "groups" may be absent. Nothing when the text does not have this form; `flaw` then says
/// why, as above.
std::optional<std::vector<ShareEntry>> parseShares(std::string_view text, std::string& flaw);

/// The text of shares that have no flaw.
std::string renderShares(const std::vector<ShareEntry>& shares);

} // namespace velt

#endif
