#include "cli/console.h"

#include "base/file.h"
#include "cli/failure.h"

#include <istream>
#include <iterator>

namespace velt::cli {

std::string readInput(Console& console, const std::string& name) {
    if (name == "-") {
        return {std::istreambuf_iterator(console.in), {}};
    }
    auto text = readFile(name);
    if (!text) {
        throw Failure(ExitCode::local, text.error().message,
                      "Name a readable file, or - for the standard input.");
    }
    return std::move(*text);
}

std::string inputName(const std::string& name) {
    return name == "-" ? "standard input" : name;
}

} // namespace velt::cli
