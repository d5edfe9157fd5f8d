// velt-authorized-keys USER [STATE]
//
// Writes the keys with which the user may log in over SFTP, for the daemon's AuthorizedKeysCommand: those
// that administrators have stored below the state root STATE (without one: none), then those of the user's
// own files. What cannot be told is left out, with a line in the system's log; when that leaves nothing, it
// fails.
//
// With root's rights it opens one file, that of the user's stored keys: the user may neither read it nor know
// of it, and the alternatives, a set-group-id program or a second daemon that hands keys out, would each give
// somebody else the way to it. Then it takes the user's rights for good, and only with those it looks into
// what it has read, and for files that the user may have made.
#include "standalone/login/authorized_keys.h"

#include "base/file.h"
#include "standalone/core/state_root.h"
#include "standalone/keys/key_store.h"

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

velt::Result<std::string> linesIn(const velt::Result<std::optional<std::string>>& text,
                                  const passwd& account) {
    if (!text) {
        return text.error();
    }
    if (!*text) {
        return std::string();
    }
    VELT_ASSIGN_OR_RETURN(const auto file, velt::parseKeyFile(account.pw_name, **text));
    return velt::keysForDaemon(file, account.pw_uid);
}

/// Tells of keys that cannot be used; the others are.
std::string orNone(const velt::Result<std::string>& keys, const char* user) {
    if (!keys) {
        refuse(user, keys.error().message);
    }
    return keys.valueOr("");
}

int run(const char* user, const char* state) {
    const passwd* const account = getpwnam(user);
    if (account == nullptr) {
        return refuse(user, "There is no such user.");
    }
    velt::Result<std::optional<std::string>> text(std::nullopt);
    if (state != nullptr) {
        velt::setStateRoot(state);
        text = velt::readKeyFile(account->pw_name);
    }
    if (!takeRightsOf(*account)) {
        return refuse(user, "Cannot switch to the account.");
    }
    const auto stored = linesIn(text, *account);
    const auto own = velt::readKeysForTransfer(account->pw_dir, account->pw_uid);
    const std::string keys = orNone(stored, user) + orNone(own, user);
    if (keys.empty() && (!stored || !own)) {
        return EXIT_FAILURE;
    }
    return velt::writeAll(STDOUT_FILENO, keys) ? EXIT_SUCCESS : EXIT_FAILURE;
}

} // namespace

int main(int count, char** arguments) {
    // The daemon throws the error output away; whoever runs this by hand sees why there is no key.
    openlog("velt-authorized-keys", LOG_PID | LOG_PERROR, LOG_AUTHPRIV);
    if (count != 2 && count != 3) {
        return refuse("-", "usage: velt-authorized-keys USER [STATE]");
    }
    try {
        return run(arguments[1], count == 3 ? arguments[2] : nullptr);
    } catch (const std::exception& error) {
        return refuse(arguments[1], error.what());
    }
}
