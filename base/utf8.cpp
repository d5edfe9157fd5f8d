#include "base/utf8.h"

#include <algorithm>
#include <array>

namespace velt {

namespace {

struct Form {
    unsigned mask;
    unsigned lead;
    std::size_t length;
    char32_t least; ///< smaller characters have a shorter form and must not use this one
};
constexpr std::array<Form, 4> forms{{
    {0x80, 0x00, 1, 0},
    {0xE0, 0xC0, 2, 0x80},
    {0xF0, 0xE0, 3, 0x800},
    {0xF8, 0xF0, 4, 0x10000},
}};

unsigned byteAt(std::string_view text, std::size_t index) {
    return static_cast<unsigned char>(text[index]);
}

bool isCharacter(char32_t code) {
    return code <= 0x10FFFF && (code < 0xD800 || code > 0xDFFF);
}

Utf8Character decode(std::string_view text, const Form& form) {
    if (text.size() < form.length) {
        return {};
    }
    char32_t code = byteAt(text, 0) & ~form.mask;
    for (std::size_t i = 1; i < form.length; ++i) {
        if ((byteAt(text, i) & 0xC0) != 0x80) {
            return {};
        }
        code = (code << 6) | (byteAt(text, i) & 0x3F);
    }
    return code >= form.least && isCharacter(code) ? Utf8Character{form.length, code} : Utf8Character{};
}

} // namespace

Utf8Character firstUtf8Character(std::string_view text) {
    for (const Form& form : forms) {
        if ((byteAt(text, 0) & form.mask) == form.lead) {
            return decode(text, form);
        }
    }
    return {};
}

std::size_t findInvalidUtf8(std::string_view text) {
    for (std::size_t i = 0; i < text.size();) {
        const std::size_t length = firstUtf8Character(text.substr(i)).length;
        if (length == 0) {
            return i;
        }
        i += length;
    }
    return std::string_view::npos;
}

namespace {

struct Codes {
    char32_t first;
    char32_t last;
};

// Control and private characters, what is ignored by default (Unicode, DerivedCoreProperties.txt), what has
// no width or direction of its own, and what looks like a blank.
constexpr std::array<Codes, 28> unseen{
    {{0x00, 0x1F},       {0x7F, 0xA0},       {0xAD, 0xAD},       {0x34F, 0x34F},     {0x61C, 0x61C},
     {0x115F, 0x1160},   {0x1680, 0x1680},   {0x17B4, 0x17B5},   {0x180B, 0x180F},   {0x2000, 0x200F},
     {0x2028, 0x202F},   {0x205F, 0x206F},   {0x2800, 0x2800},   {0x3000, 0x3000},   {0x3164, 0x3164},
     {0xE000, 0xF8FF},   {0xFE00, 0xFE0F},   {0xFEFF, 0xFEFF},   {0xFFA0, 0xFFA0},   {0xFFF0, 0xFFFB},
     {0xFFFE, 0xFFFF},   {0x13430, 0x1343F}, {0x16FE4, 0x16FE4}, {0x1BCA0, 0x1BCA3}, {0x1D159, 0x1D159},
     {0x1D173, 0x1D17A}, {0xE0000, 0xE0FFF}, {0xF0000, 0x10FFFF}}};

bool isUnseen(char32_t code) {
    return std::ranges::any_of(
        unseen, [code](const Codes& codes) { return code >= codes.first && code <= codes.last; });
}

} // namespace

bool holdsUnseen(std::string_view text) {
    while (!text.empty()) {
        const auto [length, code] = firstUtf8Character(text);
        if (length == 0 || isUnseen(code)) {
            return true;
        }
        text.remove_prefix(length);
    }
    return false;
}

} // namespace velt
