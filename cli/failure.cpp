#include "cli/failure.h"

#include "cli/text_table.h"

#include <ostream>

namespace velt::cli {

void writeFailure(std::ostream& out, const Failure& failure) {
    out << "veltctl: " << printable(failure.what()) << '\n';
    for (const std::string& note : failure.notes()) {
        out << "  " << printable(note) << '\n';
    }
    if (!failure.hint().empty()) {
        out << "What to do: " << printable(failure.hint()) << '\n';
    }
}

} // namespace velt::cli
