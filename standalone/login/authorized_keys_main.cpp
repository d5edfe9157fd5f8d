// velt-authorized-keys USER
//
// Writes the keys with which the user may log in over SFTP, for the daemon's AuthorizedKeysCommand. Nothing,
// and a line in the system's log, when they cannot be told. With root's rights it takes the user's first.
#include "standalone/login/authorized_keys.h"

#include "base/file.h"

#include <grp.h>
#include <pwd.h>
#include <syslog.h>
#include <unistd.h>

#include <cstdlib>
#include <exception>

namespace {

bool takeRightsOf(const passwd& account) {
    return geteuid() != 0 || (initgroups(account.pw_name, account.pw_gid) == 0 &&
                              setresgid(account.pw_gid, account.pw_gid, account.pw_gid) == 0 &&
                              setresuid(account.pw_uid, account.pw_uid, account.pw_uid) == 0);
}

int refuse(const char* user, const std::string& why) {
    syslog(LOG_AUTHPRIV | LOG_WARNING, "keys of %s: %s", user, why.c_str());
    return EXIT_FAILURE;
}

int run(const char* user) {
    const passwd* const account = getpwnam(user);
    if (account == nullptr) {
        return refuse(user, "There is no such user.");
    }
    if (!takeRightsOf(*account)) {
        return refuse(user, "Cannot switch to the account.");
    }
    const auto keys = velt::readKeysForTransfer(account->pw_dir, account->pw_uid);
    if (!keys) {
        return refuse(user, keys.error().message);
    }
    return velt::writeAll(STDOUT_FILENO, *keys) ? EXIT_SUCCESS : EXIT_FAILURE;
}

} // namespace

int main(int count, char** arguments) {
    openlog("velt-authorized-keys", LOG_PID, LOG_AUTHPRIV);
    if (count != 2) {
        return refuse("-", "usage: velt-authorized-keys USER");
    }
    try {
        return run(arguments[1]);
    } catch (const std::exception& error) {
        return refuse(arguments[1], error.what());
    }
}
