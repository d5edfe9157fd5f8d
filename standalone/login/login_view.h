// What one login of the FTP daemon may see.
#ifndef VELT_STANDALONE_LOGIN_LOGIN_VIEW_H
#define VELT_STANDALONE_LOGIN_LOGIN_VIEW_H

#include "base/result.h"
#include "standalone/shares/access.h"

#include <filesystem>
#include <string>
#include <vector>

namespace velt {

/// What a login sees when no chroot rule applies to it.
enum class DefaultView {
    home,      ///< the user's home
    shares,    ///< the shares side by side
    anonymous, ///< the share that anonymousShare names, else the shares side by side; rules never apply
    server,    ///< everything, with the rights that the daemon has; a login with a rule is refused
};

/// A login, as the daemon tells of it.
struct Login {
    DefaultView view = DefaultView::home;
    Identity user;
    std::string home;
    std::filesystem::path anonymousShare; ///< a file that holds the name of a share; "": all shares
};

/// Makes `root`, an existing folder, show what the login may see: by the chroot rule that it follows, else
/// its default view; with what the store grants on the shares. All this happens in the mount namespace of
/// this process, which must be no one else's but the session's. Gives a sentence for each share that had to
/// be left out. After an error the login is to be refused.
Result<std::vector<std::string>> makeLoginView(const Login& login, const std::filesystem::path& root);

} // namespace velt

#endif
