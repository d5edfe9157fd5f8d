#include "standalone/core/quoted_text.h"

namespace velt {

namespace {

constexpr std::string_view hexDigits = "0123456789abcdef";

unsigned char byteAt(std::string_view text, std::size_t at) {
    return at < text.size() ? static_cast<unsigned char>(text[at]) : 0;
}

bool isContinuation(unsigned char byte) {
    return (byte & 0xc0) == 0x80;
}

// The length of the printable UTF-8 sequence of two to four bytes at the front of the text, or 0. Overlong
// forms, surrogates, what lies above U+10FFFF and the control characters U+0080 to U+009F, which a terminal
// would obey, are not printable.
std::size_t printableSequence(std::string_view text) {
    const unsigned char lead = byteAt(text, 0);
    const unsigned char second = byteAt(text, 1);
    if (lead >= 0xc2 && lead <= 0xdf)
        return isContinuation(second) && !(lead == 0xc2 && second < 0xa0) ? 2 : 0;
    if (!isContinuation(second) || !isContinuation(byteAt(text, 2)))
        return 0;
    if (lead >= 0xe0 && lead <= 0xef)
        return (lead == 0xe0 && second < 0xa0) || (lead == 0xed && second >= 0xa0) ? 0 : 3;
    if (lead < 0xf0 || lead > 0xf4 || !isContinuation(byteAt(text, 3)))
        return 0;
    return (lead == 0xf0 && second < 0x90) || (lead == 0xf4 && second >= 0x90) ? 0 : 4;
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
        const unsigned char byte = byteAt(text, 0);
        std::size_t taken = 1;
        if (byte == '"' || byte == '\\') {
            quoted += '\\';
            quoted += text[0];
        } else if (byte >= 0x20 && byte < 0x7f) {
            quoted += text[0];
        } else if (const auto length = printableSequence(text); length > 0) {
            taken = length;
            quoted += text.substr(0, length);
        } else {
            quoted += "\\x";
            quoted += hexDigits[byte / 16];
            quoted += hexDigits[byte % 16];
        }
        text.remove_prefix(taken);
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
