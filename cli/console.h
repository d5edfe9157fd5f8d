// What a command has of the process that it runs in.
#ifndef VELT_CLI_CONSOLE_H
#define VELT_CLI_CONSOLE_H

#include <functional>
#include <iosfwd>
#include <optional>
#include <string>

namespace velt::cli {

struct Console {
    std::istream& in;
    std::ostream& out;
    std::ostream& err;

    /// The value of an environment variable.
    std::function<std::optional<std::string>(const std::string& name)> environment;

    /// From this call on an interruption by the user no longer ends the process; interrupted() tells of it.
    std::function<void()> watchInterruptions;
    std::function<bool()> interrupted;
};

/// The text of the named file, or of the standard input for "-". Throws Failure (usage) when it cannot be
/// read.
std::string readInput(Console& console, const std::string& name);

} // namespace velt::cli

#endif
