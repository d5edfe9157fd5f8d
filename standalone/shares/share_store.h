// The shares of this server: "/etc/velt/shares.json" below the state root.
#ifndef VELT_STANDALONE_SHARES_SHARE_STORE_H
#define VELT_STANDALONE_SHARES_SHARE_STORE_H

#include <map>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace velt {

/// What the store grants an account on a share. `none` is a refusal, unlike no entry at all.
enum class ShareGrant {
    none,
    read,
    write, ///< reading and writing
};

struct ShareEntry {
    std::string name;    ///< 1 to 255 bytes of UTF-8, no '/' and no control character, neither "." nor ".."
    std::string comment; ///< at most 1024 bytes of UTF-8 in one line
    std::string
        path; ///< the folder: absolute, at most 4095 bytes of UTF-8, no control character, no ".." in it
    bool offeredToFtp = false;
    std::map<std::string, ShareGrant> users;
    std::map<std::string, ShareGrant> groups;
};

/// The stored shares in their order; none before the first store. Nothing, with the last error naming the
/// file and what is wrong in it, when the file cannot be read or does not have its form. Thread-safe.
std::optional<std::vector<ShareEntry>> allShares();

/// Stores these shares in place of the stored ones; FTP logins follow them from the next one on. Whoever
/// changes what allShares() returned holds a StateLock from before that call until after this one. Negative,
/// with the last error set and nothing stored, when a share is not as above, when a name is there twice, or
/// when the file cannot be written. Thread-safe.
int saveShares(const std::vector<ShareEntry>& shares);

/// Whether this is a name that a share may have.
bool isShareName(std::string_view name);

} // namespace velt

#endif
