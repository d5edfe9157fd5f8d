#include "base/printable.h"

#include "base/text.h"

namespace velt {

namespace {

// Control characters below `c0End` and from DEL to U+009F, which is two bytes in UTF-8, as hexadecimal.
std::string escapeControls(std::string_view text, unsigned char c0End, const std::string& prefix) {
    std::string result;
    for (std::size_t i = 0; i < text.size(); ++i) {
        const auto byte = static_cast<unsigned char>(text[i]);
        const auto next = i + 1 < text.size() ? static_cast<unsigned char>(text[i + 1]) : 0;
        const bool c1 = byte == 0xC2 && next >= 0x80 && next < 0xA0;
        if (c1) {
            result += prefix + hexadecimal({&text[++i], 1});
        } else if (byte < c0End || byte == 0x7F) {
            result += prefix + hexadecimal({&text[i], 1});
        } else {
            result += text[i];
        }
    }
    return result;
}

} // namespace

std::string printable(std::string_view text) {
    return escapeControls(text, 0x20, "\\x");
}

std::string printableJson(const std::string& json) {
    return escapeControls(json, 0, "\\u00");
}

} // namespace velt
