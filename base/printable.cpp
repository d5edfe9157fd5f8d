#include "base/printable.h"

#include "base/text.h"
#include "base/utf8.h"

#include <algorithm>

namespace velt {

namespace {

/// Which is hidden: C0 below `c0End`, DEL and C1.
bool isControl(char32_t code, char32_t c0End) {
    return code < c0End || (code >= 0x7F && code < 0xA0);
}

/// Line and paragraph separators, and what makes text after it run the other way (Unicode, UAX #9).
bool rearranges(char32_t code) {
    return (code >= 0x2028 && code <= 0x202E) || (code >= 0x2066 && code <= 0x2069);
}

std::string escape(std::string_view text, char32_t c0End, const std::string& controlPrefix) {
    std::string result;
    while (!text.empty()) {
        const Utf8Character character = firstUtf8Character(text);
        const std::string_view piece = text.substr(0, std::max<std::size_t>(character.length, 1));
        const bool isBareByte = character.length == 0 && c0End != 0;
        if (isBareByte || (character.length != 0 && isControl(character.code, c0End))) {
            result += controlPrefix + hexadecimal(piece.substr(piece.size() - 1));
        } else if (character.length != 0 && rearranges(character.code)) {
            result += "\\u20" + hexadecimal(std::string(1, static_cast<char>(character.code & 0xFFU)));
        } else {
            result += piece;
        }
        text.remove_prefix(piece.size());
    }
    return result;
}

} // namespace

std::string printable(std::string_view text) {
    return escape(text, 0x20, "\\x");
}

std::string printableJson(const std::string& json) {
    return escape(json, 0, "\\u00");
}

} // namespace velt
