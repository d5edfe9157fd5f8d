#include "cli/text_table.h"

#include <algorithm>
#include <cstddef>
#include <ostream>

namespace velt::cli {

namespace {

std::size_t characters(const std::string& text) {
    return static_cast<std::size_t>(std::count_if(
        text.begin(), text.end(), [](char c) { return (static_cast<unsigned char>(c) & 0xC0U) != 0x80U; }));
}

std::string hexEscape(unsigned char byte) {
    static const char* const digits = "0123456789abcdef";
    return std::string("\\x") + digits[byte >> 4U] + digits[byte & 0x0FU];
}

} // namespace

std::string printable(const std::string& text) {
    std::string result;
    for (std::size_t i = 0; i < text.size(); ++i) {
        const auto byte = static_cast<unsigned char>(text[i]);
        const bool c0 = byte < 0x20 || byte == 0x7F;
        // The second control set is two bytes in UTF-8, and terminals obey it too.
        const bool c1 = byte == 0xC2 && i + 1 < text.size() && static_cast<unsigned char>(text[i + 1]) < 0xA0;
        if (c1) {
            result += hexEscape(static_cast<unsigned char>(text[++i]));
        } else if (c0) {
            result += hexEscape(byte);
        } else {
            result += text[i];
        }
    }
    return result;
}

void Table::write(std::ostream& out) const {
    std::vector<std::size_t> widths(rows_.front().size());
    std::vector<std::vector<std::string>> rows = rows_;
    for (auto& row : rows) {
        for (std::size_t i = 0; i < widths.size(); ++i) {
            row.at(i) = printable(row.at(i));
            widths[i] = std::max(widths[i], characters(row[i]));
        }
    }
    for (const auto& row : rows) {
        std::string line;
        for (std::size_t i = 0; i < widths.size(); ++i) {
            line += row[i] + std::string(widths[i] - characters(row[i]) + 2, ' ');
        }
        line.erase(line.find_last_not_of(' ') + 1);
        out << line << '\n';
    }
}

} // namespace velt::cli
