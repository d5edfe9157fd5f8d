// What the FTP daemon tells the login program: the words, each ended by a NUL.
#include "standalone/login/login_arguments.h"

#include "fuzz/target.h"

#include <vector>

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    const std::string input = velt::fuzz::textOf(data, size);
    std::vector<std::string> words;
    for (std::size_t at = 0; at < input.size();) {
        const auto end = std::min(input.find('\0', at), input.size());
        words.push_back(input.substr(at, end - at));
        at = end + 1;
    }
    const auto login = velt::parseLogin(words);
    if (login) {
        velt::fuzz::check(!login->user.gids.empty(), "a user has a group");
        velt::fuzz::check(login->user.uid != static_cast<uid_t>(-1), "no number means \"no change\"");
        velt::fuzz::check(login->view <= velt::DefaultView::server, "the view is known");
    }
    return 0;
}
