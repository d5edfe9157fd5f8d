// The shares as the FTP daemon's helpers read them.
#ifndef VELT_STANDALONE_PROFTPD_SHARE_LISTS_H
#define VELT_STANDALONE_PROFTPD_SHARE_LISTS_H

#include "standalone/shares/share_store.h"

#include <functional>
#include <string>
#include <string_view>
#include <vector>

namespace velt {

/// What anonymous users may do with a share.
enum class AnonymousAccess {
    none,
    read,
    write,
};

/// The map that mod_velt_chroot consults at each login: a version line, then a line per share with its name
/// and folder, separated by a tab.
std::string shareMapText(const std::vector<ShareEntry>& shares);

/// The list that velt-share-root mounts: the shares offered to FTP below "users", and those that anonymous
/// users can reach below "anonymous".
std::string mountListText(const std::vector<ShareEntry>& shares,
                          const std::function<AnonymousAccess(const ShareEntry&)>& anonymousAccess);

} // namespace velt

#endif
