// Parts of texts.
#ifndef VELT_BASE_TEXT_H
#define VELT_BASE_TEXT_H

#include <string>
#include <string_view>

namespace velt {

inline constexpr std::string_view blanks = " \t\r";

/// The text without the blanks at its ends.
std::string_view trimmed(std::string_view text);

/// The text without any of these characters at its end.
std::string_view trimmedEnd(std::string_view text, std::string_view characters);

/// Whether the byte is a control character of ASCII.
constexpr bool isControl(char byte) {
    return static_cast<unsigned char>(byte) < 0x20 || byte == 0x7f;
}

/// The text with the letters A to Z in lower case.
std::string lowerCase(std::string_view text);

/// Two digits for each byte: "0aff".
std::string hexadecimal(std::string_view bytes);

/// Cuts the text before the first `separator` off `rest`, which becomes what follows it; "" when nothing
/// does.
std::string_view cut(std::string_view& rest, char separator);

} // namespace velt

#endif
