// All of veltctl except the process it runs in.
#ifndef VELT_CLI_PROGRAM_H
#define VELT_CLI_PROGRAM_H

#include "cli/command.h"
#include "cli/console.h"
#include "cli/failure.h"

#include <string>
#include <vector>

namespace velt::cli {

/// Runs the command that the words (without the program's name) name. Results go to the console's output,
/// errors and warnings to its error output.
ExitCode runProgram(const std::vector<std::string>& words, Console& console);

/// What every command takes.
struct GlobalOptions {
    AddressOptions server;
    bool json = false;
};

/// Adds all commands and options to the parser, which puts what the words name into `options` and `chosen`;
/// both outlive it.
void addCommands(CLI::App& app, GlobalOptions& options, Command& chosen);

} // namespace velt::cli

#endif
