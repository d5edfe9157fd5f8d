// What a command uses of the process that it runs in.
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

    /// The value of an environment variable; nothing when it is not set.
    std::function<std::optional<std::string>(const std::string& name)> environment;

    /// From this call on, an interruption by the user no longer ends the process: interrupted() reports it.
    std::function<void()> watchInterruptions;
    std::function<bool()> interrupted;

    /// Whether `out` is shown on a terminal.
    std::function<bool()> outputIsTerminal;
};

/// The text of the named file, or of the standard input for "-". Failure (usage) when it cannot be read.
std::string readInput(Console& console, const std::string& name);

/// The input for messages: the file's name, or "standard input".
std::string inputName(const std::string& name);

} // namespace velt::cli

#endif
