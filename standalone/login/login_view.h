// The root directory of one login.
#ifndef VELT_STANDALONE_LOGIN_LOGIN_VIEW_H
#define VELT_STANDALONE_LOGIN_LOGIN_VIEW_H

#include "standalone/login/login.h"

#include <filesystem>
#include <string>
#include <vector>

namespace velt {

/// Makes `root`, an existing folder, show what the login may see: by the first chroot rule of the user, else
/// by the first one of a group of the user's, else by the kind of the login; with what the store grants on
/// the shares. All this happens in the mount namespace of this process, which must be no one else's but the
/// session's. False, with the last error set, when the login is to be refused. Otherwise `remarks` gets a
/// sentence for each share that had to be left out.
bool makeLoginView(const Login& login, const std::filesystem::path& root, std::vector<std::string>& remarks);

} // namespace velt

#endif
