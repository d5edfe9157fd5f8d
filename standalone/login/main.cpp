// velt-login-view STATE KIND ROOT USER UID GIDS HOME [FILE]
//
// Makes the folder ROOT show what a login of the FTP daemon may see, in the mount namespace of the session
// that started this program, and ends: with 0 when the session may go on with ROOT as its root directory,
// else with why not on standard error. Nobody else sees anything of it, and it is gone when the session has
// ended.
//
// STATE is the state root; KIND is "home", "shares", "anonymous" or "server", as in login.h; GIDS are the
// numbers of the user's groups, the primary one first, separated by commas; FILE names the share of
// anonymous users.
#include "base/plain_text.h"
#include "standalone/core/last_error.h"
#include "standalone/core/state_root.h"
#include "standalone/login/login_view.h"

#include <grp.h>
#include <sys/stat.h>
#include <unistd.h>

#include <array>
#include <charconv>
#include <cstdio>
#include <cstdlib>
#include <exception>
#include <optional>
#include <string_view>
#include <utility>

namespace {

constexpr std::array kinds{
    std::pair{"home", velt::LoginKind::home},
    std::pair{"shares", velt::LoginKind::shares},
    std::pair{"anonymous", velt::LoginKind::anonymous},
    std::pair{"server", velt::LoginKind::server},
};

std::optional<unsigned> numberOf(std::string_view text) {
    unsigned number = 0;
    const auto [rest, error] = std::from_chars(text.data(), text.data() + text.size(), number);
    // The greatest number means "no one" to the kernel.
    const bool whole = error == std::errc() && rest == text.data() + text.size();
    return whole && number != static_cast<unsigned>(-1) ? std::optional(number) : std::nullopt;
}

bool readNumbers(std::string_view text, std::vector<gid_t>& numbers) {
    for (;;) {
        const auto comma = text.find(',');
        const auto number = numberOf(text.substr(0, comma));
        if (!number) {
            return false;
        }
        numbers.push_back(*number);
        if (comma == std::string_view::npos) {
            return true;
        }
        text.remove_prefix(comma + 1);
    }
}

bool readLogin(int count, char** arguments, velt::Login& login) {
    if (count != 8 && count != 9) {
        return false;
    }
    bool known = false;
    for (const auto& [word, kind] : kinds) {
        if (std::string_view(arguments[2]) == word) {
            login.kind = kind;
            known = true;
        }
    }
    const auto uid = numberOf(arguments[5]);
    login.user = arguments[4];
    login.uid = uid.value_or(0);
    login.home = arguments[7];
    login.anonymousShare = count == 9 ? arguments[8] : "";
    return known && uid && readNumbers(arguments[6], login.gids);
}

// The daemon has put a user's numbers in the place of some of root's.
bool becomeRoot() {
    return getuid() != 0 ||
           (setgroups(0, nullptr) == 0 && setresgid(0, 0, 0) == 0 && setresuid(0, 0, 0) == 0);
}

int refuse(std::string_view why) {
    std::fprintf(stderr, "%s\n", velt::plainText(why, 500).c_str());
    return EXIT_FAILURE;
}

int run(int count, char** arguments) {
    velt::Login login;
    if (!readLogin(count, arguments, login)) {
        return refuse("usage: velt-login-view STATE KIND ROOT USER UID GIDS HOME [FILE]");
    }
    umask(022);
    if (!becomeRoot()) {
        return refuse("Root's rights cannot be taken.");
    }
    velt::setStateRoot(arguments[1]);
    std::vector<std::string> remarks;
    if (!velt::makeLoginView(login, arguments[3], remarks)) {
        return refuse(velt::lastErrorSentence());
    }
    for (const std::string& remark : remarks) {
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
