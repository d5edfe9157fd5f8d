// The words with which a daemon starts the login program.
#ifndef VELT_STANDALONE_LOGIN_LOGIN_ARGUMENTS_H
#define VELT_STANDALONE_LOGIN_LOGIN_ARGUMENTS_H

#include "standalone/login/login_view.h"

#include <optional>
#include <string>
#include <vector>

namespace velt {

/// The login that these words describe, without the program's name: STATE VIEW ROOT USER UID GIDS HOME
/// [FILE], as main.cpp has it. Nothing when they do not have this form. STATE and ROOT are not part of the
/// login.
std::optional<Login> parseLogin(const std::vector<std::string>& words);

} // namespace velt

#endif
