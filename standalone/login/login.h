// A login of the FTP daemon, as the daemon tells of it.
#ifndef VELT_STANDALONE_LOGIN_LOGIN_H
#define VELT_STANDALONE_LOGIN_LOGIN_H

#include <sys/types.h>

#include <filesystem>
#include <string>
#include <vector>

namespace velt {

/// What the login sees when no chroot rule applies to it.
enum class LoginKind {
    home,      ///< the user's home
    shares,    ///< the shares side by side
    anonymous, ///< the share that anonymousShare names, else the shares side by side; rules never apply
    server,    ///< everything, with the rights that the daemon has; a login with a rule is refused
};

struct Login {
    LoginKind kind = LoginKind::home;
    std::string user;
    uid_t uid = 0;
    std::vector<gid_t> gids; ///< the primary group first; never empty
    std::string home;
    std::filesystem::path anonymousShare; ///< a file that holds the name of a share; "": all shares
};

} // namespace velt

#endif
