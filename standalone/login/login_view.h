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

/// A login, as the daemon describes it.
struct Login {
    DefaultView view = DefaultView::home;
    Identity user;
    std::string home;
    std::filesystem::path anonymousShare; ///< a file that holds the name of a share; "": all shares
};

/// Makes `root`, an existing folder, show what the login may see: the folder of the user's chroot rule, else
/// the default view, with the access that the shares grant. It mounts in this process's mount namespace,
/// which must belong to the session alone. Returns one sentence for each share that is left out or
/// gives less than it grants. After an error the login must be refused.
Result<std::vector<std::string>> makeLoginView(const Login& login, const std::filesystem::path& root);

} // namespace velt

#endif
