#include "base/number_text.h"

#include <charconv>

namespace velt {

std::optional<std::int64_t> parseNumber(std::string_view text) {
    std::int64_t number = 0;
    const char* const textEnd = text.data() + text.size();
    const auto [end, error] = std::from_chars(text.data(), textEnd, number);
    return error == std::errc() && end == textEnd ? std::optional(number) : std::nullopt;
}

std::string numberText(std::int64_t least, std::int64_t most) {
    if (least == most)
        return std::to_string(least);
    return "a number from " + std::to_string(least) + " to " + std::to_string(most);
}

} // namespace velt
