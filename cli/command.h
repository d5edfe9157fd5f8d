// What every command works with: the server, the console and the form of the output.
#ifndef VELT_CLI_COMMAND_H
#define VELT_CLI_COMMAND_H

#include "cli/api_client.h"
#include "cli/console.h"

#include <functional>

namespace CLI {
class App;
}

namespace velt::cli {

struct Context {
    Console& console;
    ApiClient& api;
    bool json = false; ///< the output is for programs
};

/// A command, ready to run. Throws Failure.
using Command = std::function<void(Context&)>;

// Each adds commands with their options to the parser. The command that the words name is put into `chosen`,
// which outlives the parser.
void addSettingsCommands(CLI::App& app, Command& chosen);
void addShareCommands(CLI::App& app, Command& chosen);
void addChrootCommands(CLI::App& app, Command& chosen);
void addStatusCommands(CLI::App& app, Command& chosen);
void addLogCommand(CLI::App& app, Command& chosen);
void addTokenCommands(CLI::App& app, Command& chosen);
void addDocumentCommands(CLI::App& app, Command& chosen);
void addCallCommand(CLI::App& app, Command& chosen);

} // namespace velt::cli

#endif
