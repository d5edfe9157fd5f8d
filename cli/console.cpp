#include "cli/console.h"

#include "cli/failure.h"

#include <fstream>
#include <istream>
#include <iterator>

namespace velt::cli {

std::string readInput(Console& console, const std::string& name) {
    std::ifstream file;
    if (name != "-") {
        file.open(name, std::ios::binary);
    }
    std::istream& source = name == "-" ? console.in : file;
    std::string text;
    if (source) {
        text.assign(std::istreambuf_iterator<char>(source), std::istreambuf_iterator<char>());
    }
    // A folder opens like a file; only reading it fails. A read to the end leaves the end-of-file state alone.
    if (source.bad() || (name != "-" && (!file.is_open() || file.fail()))) {
        throw Failure(ExitCode::usage, "The file " + name + " cannot be read.",
                      "Name a readable file, or - for the standard input.");
    }
    return text;
}

} // namespace velt::cli
