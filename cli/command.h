// What every command works with: the server, the console and the form of the output.
#ifndef VELT_CLI_COMMAND_H
#define VELT_CLI_COMMAND_H

#include "cli/api_client.h"
#include "cli/console.h"
#include "cli/failure.h"

#include <functional>

namespace CLI {
class App;
}

namespace velt::cli {

struct Context {
    Console& console;
    ApiClient& api;
    bool json = false;                  ///< the output is for programs
    ExitCode exitCode = ExitCode::done; ///< of a command that was carried out

    /// Writes the value as JSON when the output is for programs. False when it is for people: nothing is
    /// written.
    bool wroteJson(const Json::Value& value) const;
};

/// A command, ready to run. Throws Failure.
using Command = std::function<void(Context&)>;

/// Puts `command` into `chosen`, which outlives the parser, when the words name it.
void onWords(CLI::App* words, Command& chosen, const Command& command);

// Each adds commands with their options to the parser; see onWords for `chosen`.
void addSettingsCommands(CLI::App& app, Command& chosen);
void addShareCommands(CLI::App& app, Command& chosen);
void addChrootCommands(CLI::App& app, Command& chosen);
void addChrootUserCommands(CLI::App& chroot, Command& chosen); ///< below "chroot"
void addStatusCommands(CLI::App& app, Command& chosen);
void addDoctorCommand(CLI::App& app, Command& chosen);
void addLogCommand(CLI::App& app, Command& chosen);
void addRestartCommand(CLI::App& app, Command& chosen);
void addHistoryCommands(CLI::App& app, Command& chosen);
void addDiffCommand(CLI::App& app, Command& chosen);
void addAccessCommand(CLI::App& app, Command& chosen);
void addSessionCommands(CLI::App& app, Command& chosen);
void addTransfersCommand(CLI::App& app, Command& chosen);
void addBanCommands(CLI::App& app, Command& chosen);
void addKeyCommands(CLI::App& app, Command& chosen);
void addTokenCommands(CLI::App& app, Command& chosen);
void addDocumentCommands(CLI::App& app, Command& chosen);
void addCallCommand(CLI::App& app, Command& chosen);

} // namespace velt::cli

#endif
