// A share, and what one may be.
#ifndef VELT_STANDALONE_SHARES_SHARE_ENTRY_H
#define VELT_STANDALONE_SHARES_SHARE_ENTRY_H

#include "base/result.h"
#include "standalone/shares/access.h"

#include <map>
#include <string>
#include <vector>

namespace velt {

struct ShareEntry {
    std::string name;    ///< 1 to 255 bytes of UTF-8, no '/' and no control character, neither "." nor ".."
    std::string comment; ///< at most 1024 bytes of UTF-8 in one line
    std::string path;    ///< the folder: absolute, at most 4095 bytes of UTF-8 in one line, no ".." in it
    bool offeredToFtp = false;
    std::map<std::string, Access> users; ///< what is granted; `none` is a refusal, unlike no entry at all
    std::map<std::string, Access> groups;
};

/// Whether these can be the shares of a server: each as above, and no two of one name. The error's message
/// says which share and what is wrong, as a part of a sentence.
Result<> checkShares(const std::vector<ShareEntry>& shares);

} // namespace velt

#endif
