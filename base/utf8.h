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

/// Whether a text holds bytes that are not UTF-8, or characters that cannot be seen, or look like a blank
/// that is not U+0020: two texts that look the same could differ in them, and some turn the text around them.
bool holdsUnseen(std::string_view text);

} // namespace velt

#endif
