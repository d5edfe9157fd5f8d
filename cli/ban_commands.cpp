#include "base/json_value.h"
#include "base/printable.h"
#include "cli/change_report.h"
#include "cli/command.h"
#include "cli/failure.h"
#include "cli/json_io.h"
#include "cli/text_table.h"

#include <CLI/CLI.hpp>

#include <memory>
#include <ostream>
#include <string>

namespace velt::cli {

namespace {

void listBans(Context& context) {
    const Json::Value answer = context.api.get("/api/bans");
    if (context.wroteJson(answer)) {
        return;
    }
    Table table({"ADDRESS", "SERVICE", "FAILURES", "UNTIL"});
    for (const Json::Value& ban : answer["bans"]) {
        table.add({textAt(ban, "address"), textAt(ban, "service"), ban["failures"].asString(),
                   textAt(ban, "until")});
    }
    table.write(context.console.out);
    if (!answer["bans"].empty() && !answer["firewall"].asBool()) {
        context.console.err
            << "The firewall is off: FTP refuses these addresses' logins, and SFTP does not refuse them.\n";
    }
}

struct LiftOptions {
    std::string address;
    bool dryRun = false;
};

void liftBan(Context& context, const LiftOptions& options) {
    const std::string& address = options.address;
    const Json::Value answer =
        context.api.remove("/api/bans/" + percentEncode(address) + dryRunQuery(options.dryRun));
    if (options.dryRun) {
        writeReport(context, answer);
    } else if (!context.wroteJson(jsonObject({{"lifted", address}}))) {
        context.console.out << printable(address) << " is no longer banned.\n";
    }
}

} // namespace

void addBanCommands(CLI::App& app, Command& chosen) {
    auto options = std::make_shared<LiftOptions>();
    CLI::App* bans = app.add_subcommand("bans", "Show and lift the bans after too many failed logins");
    bans->require_subcommand(1);

    CLI::App* list = bans->add_subcommand("list", "List the addresses that are banned now");
    onWords(list, chosen, listBans);

    CLI::App* lift = bans->add_subcommand("lift", "Let an address log in again");
    lift->add_option("address", options->address, "The address that 'bans list' shows, or one of its network")
        ->required()
        ->type_name("");
    addDryRun(lift, options->dryRun);
    onWords(lift, chosen, [options](Context& context) { liftBan(context, *options); });
}

} // namespace velt::cli
