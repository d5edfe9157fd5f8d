// velt-login-view STATE VIEW ROOT USER UID GIDS HOME [FILE]
//
// Makes the folder ROOT show what a login may see, in the mount namespace of the session
// that started this program. Ends with 0 when the session may use ROOT as its root directory, else with the
// reason on standard error; standard output gets what the session may say of its files. Nobody else sees the
// view, and it ends with the session.
//
// STATE is the state root; VIEW is "home", "shares", "anonymous", "server" or "stored", as in login_view.h;
// GIDS are the numbers of the user's groups, the primary one first, separated by commas; FILE holds the name
// of the share for anonymous users.
#include "base/plain_text.h"
#include "standalone/core/state_root.h"
#include "standalone/login/login_arguments.h"

#include <grp.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cstdio>
#include <cstdlib>
#include <exception>
#include <string_view>

namespace {

// The daemon may have left some of the numbers at a user's.
bool becomeRoot() {
    return getuid() != 0 ||
           (setgroups(0, nullptr) == 0 && setresgid(0, 0, 0) == 0 && setresuid(0, 0, 0) == 0);
}

int refuse(std::string_view why) {
    std::fprintf(stderr, "%s\n", velt::plainText(why, 500).c_str());
    return EXIT_FAILURE;
}

int run(int count, char** arguments) {
    const auto login = velt::parseLogin({arguments + 1, arguments + count});
    if (!login) {
        return refuse("usage: velt-login-view STATE VIEW ROOT USER UID GIDS HOME [FILE]");
    }
    umask(022);
    if (!becomeRoot()) {
        return refuse("Cannot switch to root.");
    }
    velt::setStateRoot(arguments[1]);
    const auto remarks = velt::makeLoginView(*login, arguments[3]);
    if (!remarks) {
        return refuse(remarks.error().message);
    }
    for (const std::string& remark : *remarks) {
        std::fprintf(stderr, "%s\n", velt::plainText(remark, 500).c_str());
    }
    return EXIT_SUCCESS;
}

} // namespace

int main(int count, char** arguments) {
    try {
        return run(count, arguments);
    } catch (const std::exception& error) {
        return refuse(error.what());
    }
}
