#include "base/plain_text.h"

#include "base/utf8.h"

namespace velt {

namespace {

constexpr std::string_view replacement = "\xEF\xBF\xBD";
constexpr std::string_view ellipsis = "\xE2\x80\xA6";

bool isPlain(char32_t code) {
    const bool control = code < 0x20 || (code >= 0x7F && code < 0xA0);
    const bool separator = code == 0x2028 || code == 0x2029;
    return !control && !separator;
}

struct Piece {
    std::size_t length = 1; ///< in bytes; 1 for a byte that is not UTF-8
    bool plain = false;
};

/// The first character of a text that is not empty.
Piece firstOf(std::string_view text) {
    const Utf8Character character = firstUtf8Character(text);
    return character.length == 0 ? Piece{} : Piece{character.length, isPlain(character.code)};
}

} // namespace

bool isPlainText(std::string_view text) {
    while (!text.empty()) {
        const Piece piece = firstOf(text);
        if (!piece.plain) {
            return false;
        }
        text.remove_prefix(piece.length);
    }
    return true;
}

std::string plainText(std::string_view text, std::size_t limit) {
    std::string plain;
    std::size_t lastCut = 0; // where an ellipsis still fits behind
    while (!text.empty()) {
        const auto [length, good] = firstOf(text);
        const std::string_view piece = good ? text.substr(0, length) : replacement;
        if (plain.size() + ellipsis.size() <= limit) {
            lastCut = plain.size();
        }
        if (plain.size() + piece.size() > limit) {
            plain.resize(lastCut);
            return plain.append(ellipsis);
        }
        plain.append(piece);
        text.remove_prefix(length);
    }
    return plain;
}

} // namespace velt
