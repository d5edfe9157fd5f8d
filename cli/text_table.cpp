#include "cli/text_table.h"

#include "base/printable.h"

#include <algorithm>
#include <cstddef>
#include <ostream>

namespace velt::cli {

namespace {

std::size_t characters(const std::string& text) {
    return static_cast<std::size_t>(std::count_if(
        text.begin(), text.end(), [](char c) { return (static_cast<unsigned char>(c) & 0xC0U) != 0x80U; }));
}

} // namespace

void Table::add(std::vector<std::string> cells) {
    std::ranges::transform(cells, cells.begin(), printable);
    rows_.push_back(std::move(cells));
}

void Table::write(std::ostream& out) const {
    std::vector<std::size_t> widths(rows_.front().size());
    for (const auto& row : rows_) {
        for (std::size_t i = 0; i < widths.size(); ++i) {
            widths[i] = std::max(widths[i], characters(row.at(i)));
        }
    }
    for (const auto& row : rows_) {
        std::string line;
        for (std::size_t i = 0; i < widths.size(); ++i) {
            line += row[i] + std::string(widths[i] - characters(row[i]) + 2, ' ');
        }
        line.erase(line.find_last_not_of(' ') + 1);
        out << line << '\n';
    }
}

} // namespace velt::cli
