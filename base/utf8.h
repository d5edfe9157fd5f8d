// Characters in UTF-8.
#ifndef VELT_BASE_UTF8_H
#define VELT_BASE_UTF8_H

#include <cstddef>
#include <string_view>

namespace velt {

struct Utf8Character {
    std::size_t length = 0; ///< in bytes; 0: the text does not begin with a well-formed character
    char32_t code = 0;
};

/// The character that the text, which is not empty, begins with.
Utf8Character firstUtf8Character(std::string_view text);

/// The offset of the first byte that is not UTF-8, or npos.
std::size_t findInvalidUtf8(std::string_view text);

/// Whether a well-formed text holds characters that steer a terminal or a reader instead of being seen:
/// control characters, and those of Unicode's category Cf (marks of direction, joiners, blanks of no width,
/// tags).
bool holdsSteering(std::string_view text);

} // namespace velt

#endif
