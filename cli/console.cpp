#include "cli/console.h"

#include "cli/failure.h"

#include <cerrno>
#include <cstring>
#include <fstream>
#include <istream>

namespace velt::cli {

std::string readInput(Console& console, const std::string& name) {
    std::ifstream file;
    if (name != "-") {
        file.open(name, std::ios::binary);
    }
    std::istream& source = name == "-" ? console.in : file;
    std::string text;
    char buffer[4096];
    while (source.read(buffer, sizeof buffer) || source.gcount() > 0) {
        text.append(buffer, static_cast<std::size_t>(source.gcount()));
    }
    // A folder opens like a file; only reading it fails.
    if (source.bad() || (name != "-" && !file.is_open())) {
        throw Failure(ExitCode::usage, "Cannot read " + inputName(name) + ": " + std::strerror(errno) + ".",
                      "Name a readable file, or - for the standard input.");
    }
    return text;
}

std::string inputName(const std::string& name) {
    return name == "-" ? "standard input" : name;
}

} // namespace velt::cli
