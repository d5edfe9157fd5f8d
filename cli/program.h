// All of veltctl except the process it runs in.
#ifndef VELT_CLI_PROGRAM_H
#define VELT_CLI_PROGRAM_H

#include "cli/console.h"
#include "cli/exit_code.h"

#include <string>
#include <vector>

namespace velt::cli {

/// Runs the command that the words (without the program's name) name. Results go to the console's output,
/// errors and warnings to its error output.
ExitCode runProgram(const std::vector<std::string>& words, Console& console);

/// Every command as its words ("chroot rules add"), with its options ("--json"): for tests of the manual page
/// and the completion.
struct CommandDescription {
    std::string words;
    std::vector<std::string> options;
};
std::vector<CommandDescription> describeCommands();

} // namespace velt::cli

#endif
