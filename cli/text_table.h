// Tables for people.
#ifndef VELT_CLI_TEXT_TABLE_H
#define VELT_CLI_TEXT_TABLE_H

#include <iosfwd>
#include <string>
#include <vector>

namespace velt::cli {

class Table {
public:
    explicit Table(std::vector<std::string> titles) : rows_{std::move(titles)} {}

    /// Adds a row with as many cells as there are titles. Cells may hold any text: they are written
    /// printable.
    void add(std::vector<std::string> cells);

    /// Writes the titles and the rows, the columns aligned by characters (not bytes).
    void write(std::ostream& out) const;

private:
    std::vector<std::vector<std::string>> rows_;
};

} // namespace velt::cli

#endif
