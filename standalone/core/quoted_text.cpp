#include "standalone/core/quoted_text.h"

#include "base/utf8.h"

#include <algorithm>

namespace velt {

namespace {

constexpr std::string_view hexDigits = "0123456789abcdef";

// The length of the character that the text begins with; 0 for a byte that is not UTF-8, and for a control
// character, which a terminal would obey.
std::size_t printableLength(std::string_view text) {
    const Utf8Character character = firstUtf8Character(text);
    const bool control = character.code < 0x20 || (character.code >= 0x7f && character.code < 0xa0);
    return control ? 0 : character.length;
}

int hexValue(char digit) {
    const auto at = hexDigits.find(digit);
    return at == std::string_view::npos ? -1 : static_cast<int>(at);
}

// Reads the escape at the front, which begins with a backslash; its length, or 0 when it is not one of ours.
std::size_t readEscape(std::string_view text, char& byte) {
    if (text.size() < 2)
        return 0;
    if (text[1] == '"' || text[1] == '\\') {
        byte = text[1];
        return 2;
    }
    if (text[1] != 'x' || text.size() < 4)
        return 0;
    const int high = hexValue(text[2]);
    const int low = hexValue(text[3]);
    if (high < 0 || low < 0)
        return 0;
    byte = static_cast<char>(high * 16 + low);
    return 4;
}

} // namespace

std::string quotedText(std::string_view text) {
    std::string quoted = "\"";
    while (!text.empty()) {
        const std::size_t length = printableLength(text);
        if (length == 0) {
            const auto byte = static_cast<unsigned char>(text[0]);
            quoted += "\\x";
            quoted += hexDigits[byte / 16];
            quoted += hexDigits[byte % 16];
        } else if (text[0] == '"' || text[0] == '\\') {
            quoted += '\\';
        }
        quoted += text.substr(0, length);
        text.remove_prefix(std::max<std::size_t>(length, 1));
    }
    return quoted + '"';
}

std::optional<std::string> readQuotedText(std::string_view quoted) {
    if (quoted.size() < 2 || quoted.front() != '"' || quoted.back() != '"')
        return std::nullopt;
    quoted = quoted.substr(1, quoted.size() - 2);
    std::string text;
    while (!quoted.empty()) {
        char byte = quoted.front();
        std::size_t taken = 1;
        if (byte == '\\')
            taken = readEscape(quoted, byte);
        else if (byte == '"')
            taken = 0;
        if (taken == 0)
            return std::nullopt;
        text += byte;
        quoted.remove_prefix(taken);
    }
    return text;
}

} // namespace velt
