#include "standalone/login/login_arguments.h"

#include <algorithm>
#include <array>
#include <charconv>
#include <string_view>
#include <utility>

namespace velt {
namespace {

/// In the order of DefaultView.
constexpr std::array<std::string_view, 5> views{"home", "shares", "anonymous", "server", "stored"};

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

} // namespace

std::optional<Login> parseLogin(const std::vector<std::string>& words) {
    if (words.size() != 7 && words.size() != 8) {
        return std::nullopt;
    }
    const auto view = std::ranges::find(views, words[1]);
    const auto uid = numberOf(words[4]);
    auto gids = numbersOf(words[5]);
    if (view == views.end() || !uid || !gids) {
        return std::nullopt;
    }
    return Login{static_cast<DefaultView>(view - views.begin()),
                 {words[3], *uid, std::move(*gids)},
                 words[6],
                 words.size() == 8 ? words[7] : ""};
}

} // namespace velt
