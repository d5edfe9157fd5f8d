#include "cli/program.h"

#include "cli/failure.h"
#include "cli/server_refusal.h"

#include <CLI/CLI.hpp>

#include <algorithm>
#include <ostream>

namespace velt::cli {

namespace {

constexpr const char* exitCodes =
    "Exit codes: 0 done, 1 local file, 2 usage, 3 input refused, 4 conflict, 5 the server failed, "
    "6 no connection or no access, 7 a dry run or diff found something, 8 the server is not well.";

void addGlobalOptions(CLI::App& app, GlobalOptions& options) {
    app.add_flag("--json", options.json, "Write JSON, for programs");
    CLI::Option* url =
        app.add_option("--url", options.server.url, "Address of the server (or VELT_URL)")->type_name("URL");
    app.add_option("--socket", options.server.socket,
                   std::string("Unix socket of the server (or VELT_SOCKET, default ") + defaultSocket + ")")
        ->type_name("PATH")
        ->excludes(url);
    app.add_option("--token-file", options.server.tokenFile,
                   "File with the token (or the token in VELT_TOKEN)")
        ->type_name("FILE");
    app.add_option("--ca-file", options.server.caFile, "Certificates to trust for https")->type_name("FILE");
    app.add_option("--timeout", options.server.timeoutSeconds, "Seconds to wait for an answer (default 60)")
        ->check(CLI::Range(1, 86400))
        ->type_name("SECONDS");
}

// The command that was meant, as far as the words name one.
std::string chosenWords(const CLI::App& app) {
    std::string words = "veltctl";
    for (const CLI::App* at = &app; !at->get_subcommands().empty();) {
        at = at->get_subcommands().front();
        words += " " + at->get_name();
    }
    return words;
}

ExitCode endOfParsing(const CLI::App& app, const CLI::ParseError& error, Console& console) {
    if (error.get_exit_code() == static_cast<int>(CLI::ExitCodes::Success)) {
        app.exit(error, console.out, console.err); // help or version
        return ExitCode::done;
    }
    std::string message = error.what();
    message.erase(message.find_last_not_of('\n') + 1);
    writeFailure(console.err,
                 Failure(ExitCode::usage, message + ".", "See '" + chosenWords(app) + " --help'."));
    return ExitCode::usage;
}

ExitCode runCommand(const Command& command, const GlobalOptions& options, Console& console) {
    ApiClient api(findServer(options.server, console));
    Context context{console, api, options.json, ExitCode::done};
    try {
        command(context);
    } catch (const Json::Exception&) {
        throw unexpectedAnswer("The server's answer is not what veltctl expects.");
    }
    console.out.flush();
    if (!console.out) {
        throw Failure(ExitCode::local, "Cannot write the output.",
                      "Check that the output is writable and has free space.");
    }
    return context.exitCode;
}

} // namespace

void addCommands(CLI::App& app, GlobalOptions& options, Command& chosen) {
    app.fallthrough(); // options may follow the command
    app.require_subcommand(1);
    app.set_version_flag("--version", VELT_VERSION);
    app.footer(exitCodes);
    addGlobalOptions(app, options);
    addStatusCommands(app, chosen);
    addDoctorCommand(app, chosen);
    addLogCommand(app, chosen);
    addSettingsCommands(app, chosen);
    addShareCommands(app, chosen);
    addChrootCommands(app, chosen);
    addRestartCommand(app, chosen);
    addHistoryCommands(app, chosen);
    addDiffCommand(app, chosen);
    addAccessCommand(app, chosen);
    addSessionCommands(app, chosen);
    addTransfersCommand(app, chosen);
    addBanCommands(app, chosen);
    addKeyCommands(app, chosen);
    addTokenCommands(app, chosen);
    addDocumentCommands(app, chosen);
    addCallCommand(app, chosen);
}

ExitCode runProgram(const std::vector<std::string>& words, Console& console) {
    CLI::App app("Administers the file-transfer services of a server", "veltctl");
    GlobalOptions options;
    Command command;
    addCommands(app, options, command);
    std::vector<std::string> reversed(words.rbegin(), words.rend()); // the parser takes the last word first
    try {
        app.parse(std::move(reversed));
        return runCommand(command, options, console);
    } catch (const CLI::ParseError& error) {
        return endOfParsing(app, error, console);
    } catch (const Failure& failure) {
        console.out.flush();
        writeFailure(console.err, failure);
        return failure.code();
    }
}

} // namespace velt::cli
