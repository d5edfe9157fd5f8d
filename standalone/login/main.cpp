// velt-login-view STATE VIEW ROOT USER UID GIDS HOME [FILE]
//
// Makes the folder ROOT show what a login of the FTP daemon may see, in the mount namespace of the session
// that started this program. Ends with 0 when the session may use ROOT as its root directory, else with the
// reason on standard error. Nobody else sees the view, and it ends with the session.
//
// STATE is the state root; VIEW is "home", "shares", "anonymous" or "server", as in login_view.h; GIDS are
// the numbers of the user's groups, the primary one first, separated by commas; FILE holds the name
// of the share for anonymous users.
#include "base/plain_text.h"
#include "standalone/core/state_root.h"
#include "standalone/login/login_view.h"

#include <grp.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <charconv>
#include <cstdio>
#include <cstdlib>
#include <exception>
#include <optional>
#include <string_view>
#include <utility>
#include <vector>

namespace {

/// In the order of DefaultView.
constexpr std::array<std::string_view, 4> views{"home", "shares", "anonymous", "server"};

std::optional<unsigned> numberOf(std::string_view text) {
    unsigned number = 0;
    const auto [rest, error] = std::from_chars(text.data(), text.data() + text.size(), number);
    // The greatest number means "no change" to the kernel.
    const bool whole = error == std::errc() && rest == text.data() + text.size();
    return whole && number != static_cast<unsigned>(-1) ? std::optional(number) : std::nullopt;
}

std::optional<std::vector<gid_t>> numbersOf(std::string_view text) {
    std::vector<gid_t> numbers;
    for (;;) {
        const auto comma = text.find(',');
        const auto number = numberOf(text.substr(0, comma));
        if (!number) {
            return std::nullopt;
        }
        numbers.push_back(*number);
        if (comma == std::string_view::npos) {
            return numbers;
        }
        text.remove_prefix(comma + 1);
    }
}

std::optional<velt::Login> loginOf(int count, char** arguments) {
    if (count != 8 && count != 9) {
        return std::nullopt;
    }
    const auto view = std::ranges::find(views, arguments[2]);
    const auto uid = numberOf(arguments[5]);
    auto gids = numbersOf(arguments[6]);
    if (view == views.end() || !uid || !gids) {
        return std::nullopt;
    }
    return velt::Login{static_cast<velt::DefaultView>(view - views.begin()),
                       {arguments[4], *uid, std::move(*gids)},
                       arguments[7],
                       count == 9 ? arguments[8] : ""};
}

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
    const auto login = loginOf(count, arguments);
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
