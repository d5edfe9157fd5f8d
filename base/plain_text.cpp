#include "base/plain_text.h"

#include <array>
#include <cstdint>

namespace velt {

namespace {

constexpr std::string_view replacement = "\xEF\xBF\xBD";
constexpr std::string_view ellipsis = "\xE2\x80\xA6";

struct Character {
    std::size_t length = 1; ///< in bytes; 1 for a byte that starts no character
    bool plain = false;
};

struct Form {
    unsigned mask;
    unsigned lead;
    std::size_t length;
    std::uint32_t least; ///< smaller characters have a shorter form and must not use this one
};
constexpr std::array<Form, 4> forms{{
    {0x80, 0x00, 1, 0},
    {0xE0, 0xC0, 2, 0x80},
    {0xF0, 0xE0, 3, 0x800},
    {0xF8, 0xF0, 4, 0x10000},
}};

bool isPlain(std::uint32_t code) {
    if (code < 0x20 || (code >= 0x7F && code < 0xA0)) {
        return false;
    }
    if (code == 0x2028 || code == 0x2029) {
        return false;
    }
    return code <= 0x10FFFF && (code < 0xD800 || code > 0xDFFF);
}

unsigned byteAt(std::string_view text, std::size_t index) {
    return static_cast<unsigned char>(text[index]);
}

/// The first character of a text that is not empty.
Character firstOf(std::string_view text) {
    for (const Form& form : forms) {
        if ((byteAt(text, 0) & form.mask) != form.lead) {
            continue;
        }
        if (text.size() < form.length) {
            return {};
        }
        std::uint32_t code = byteAt(text, 0) & ~form.mask;
        for (std::size_t i = 1; i < form.length; ++i) {
            if ((byteAt(text, i) & 0xC0) != 0x80) {
                return {};
            }
            code = (code << 6) | (byteAt(text, i) & 0x3F);
        }
        return code < form.least ? Character{} : Character{form.length, isPlain(code)};
    }
    return {};
}

} // namespace

bool isPlainText(std::string_view text) {
    while (!text.empty()) {
        const Character character = firstOf(text);
        if (!character.plain) {
            return false;
        }
        text.remove_prefix(character.length);
    }
    return true;
}

std::string plainText(std::string_view text, std::size_t limit) {
    std::string plain;
    std::size_t lastCut = 0; // where an ellipsis still fits behind
    while (!text.empty()) {
        const Character character = firstOf(text);
        const std::string_view piece = character.plain ? text.substr(0, character.length) : replacement;
        if (plain.size() + ellipsis.size() <= limit) {
            lastCut = plain.size();
        }
        if (plain.size() + piece.size() > limit) {
            plain.resize(lastCut);
            return plain.append(ellipsis);
        }
        plain.append(piece);
        text.remove_prefix(character.length);
    }
    return plain;
}

} // namespace velt
