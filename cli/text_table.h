// Tables for people.
#ifndef VELT_CLI_TEXT_TABLE_H
#define VELT_CLI_TEXT_TABLE_H

#include <iosfwd>
#include <string>
#include <vector>

namespace velt::cli {

/// A text from the server without anything that a terminal would obey: control characters become \xNN.
std::string printable(const std::string& text);

class Table {
public:
    explicit Table(std::vector<std::string> titles) : rows_{std::move(titles)} {}

    /// Adds a row with as many cells as there are titles.
    void add(std::vector<std::string> cells) { rows_.push_back(std::move(cells)); }

    /// Writes the titles and the rows, the columns aligned by characters (not bytes).
    void write(std::ostream& out) const;

private:
    std::vector<std::vector<std::string>> rows_;
};

} // namespace velt::cli

#endif
