// The text form of the shares.
#ifndef VELT_STANDALONE_SHARES_SHARE_FILE_H
#define VELT_STANDALONE_SHARES_SHARE_FILE_H

#include "standalone/shares/share_entry.h"

#include <string>
#include <string_view>
#include <vector>

namespace velt {

/// Reads the text of the shares' file, JSON in its strict form:
///
///     {"version": 1, "shares": [{"name": "music", "comment": "", "path": "/srv/music", "ftp": true,
///                                "users": {"alice": "write"}, "groups": {"staff": "read"}}]}
///
/// All but "name" and "path" of a share may be absent. The error of a damaged text names the file and what is
/// wrong in it.
Result<std::vector<ShareEntry>> parseShares(std::string_view text);

} // namespace velt

#endif
