#include "base/printable.h"
#include "cli/change_report.h"
#include "cli/command.h"
#include "cli/json_io.h"

#include <CLI/CLI.hpp>

#include <memory>
#include <ostream>
#include <string>

namespace velt::cli {

namespace {

struct RestartOptions {
    std::string service;
    bool endSessions = false;
    bool dryRun = false;
};

void restart(Context& context, const RestartOptions& options) {
    std::string query = options.endSessions ? "?sessions=end" : "?sessions=keep";
    query += options.service.empty() ? "" : "&service=" + percentEncode(options.service);
    query += options.dryRun ? "&dry_run=true" : "";
    const Json::Value answer = context.api.post("/api/restart" + query, Json::objectValue);
    if (options.dryRun) {
        writeReport(context, answer);
        return;
    }
    if (context.wroteJson(answer)) {
        return;
    }
    for (const Json::Value& service : answer["services"]) {
        const int kept = service["kept"].asInt();
        const int ended = service["ended"].asInt();
        context.console.out << printable(textAt(service, "service")) << ": restarted";
        if (kept != 0 || ended != 0) {
            context.console.out << ", " << kept << (kept == 1 ? " session goes on, " : " sessions go on, ")
                                << ended << " ended";
        }
        context.console.out << '\n';
    }
    context.console.out << "The services that are on run with what is stored now.\n";
}

} // namespace

void addRestartCommand(CLI::App& app, Command& chosen) {
    auto options = std::make_shared<RestartOptions>();
    CLI::App* command = app.add_subcommand(
        "restart", "Have the services take up a new certificate or program, and start those that are down");
    command->add_option("service", options->service, "ftp or sftp (default: both)")
        ->check(CLI::IsMember({"ftp", "sftp"}))
        ->type_name("");
    command->add_flag("--end-sessions", options->endSessions, "End the open sessions; else they go on");
    addDryRun(command, options->dryRun);
    onWords(command, chosen, [options](Context& context) { restart(context, *options); });
}

} // namespace velt::cli
