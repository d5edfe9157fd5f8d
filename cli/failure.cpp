#include "cli/failure.h"

#include "base/printable.h"

#include <ostream>
#include <sstream>

namespace velt::cli {

void writeFailure(std::ostream& out, const Failure& failure) {
    out << "veltctl: " << printable(failure.what()) << '\n';
    for (const std::string& note : failure.notes()) {
        std::istringstream lines(note);
        for (std::string line; std::getline(lines, line);) {
            out << "  " << printable(line) << '\n';
        }
    }
    if (!failure.hint().empty()) {
        out << "What to do: " << printable(failure.hint()) << '\n';
    }
}

} // namespace velt::cli
