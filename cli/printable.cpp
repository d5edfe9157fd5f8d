#include "cli/printable.h"

namespace velt::cli {

namespace {

void appendHex(std::string& text, unsigned char byte) {
    static const char* const digits = "0123456789abcdef";
    text += digits[byte >> 4U];
    text += digits[byte & 0x0FU];
}

// Control characters below `c0End` and from DEL to U+009F, which is two bytes in UTF-8, as hexadecimal.
std::string escapeControls(const std::string& text, unsigned char c0End, const char* prefix) {
    std::string result;
    for (std::size_t i = 0; i < text.size(); ++i) {
        const auto byte = static_cast<unsigned char>(text[i]);
        const bool c1 = byte == 0xC2 && i + 1 < text.size() && static_cast<unsigned char>(text[i + 1]) < 0xA0;
        if (c1) {
            appendHex(result += prefix, static_cast<unsigned char>(text[++i]));
        } else if (byte < c0End || byte == 0x7F) {
            appendHex(result += prefix, byte);
        } else {
            result += text[i];
        }
    }
    return result;
}

} // namespace

std::string printable(const std::string& text) {
    return escapeControls(text, 0x20, "\\x");
}

std::string printableJson(const std::string& json) {
    return escapeControls(json, 0, "\\u00");
}

} // namespace velt::cli
