#include "cli/command.h"
#include "cli/json_io.h"
#include "cli/text_table.h"
#include "schema/settings_table.h"

#include <CLI/CLI.hpp>

namespace velt::cli {

namespace {

void listShares(Context& context) {
    const Json::Value answer = context.api.read({schema::security.api, 1, "list_ftp_share"});
    if (context.wroteJson(answer)) {
        return;
    }
    Table table({"SHARE"});
    for (const Json::Value& share : answer["share"]) {
        table.add({displayValue(share)});
    }
    table.write(context.console.out);
}

} // namespace

void addShareCommands(CLI::App& app, Command& chosen) {
    CLI::App* shares = app.add_subcommand("shares", "List the shares that FTP offers");
    onWords(shares, chosen, listShares);
}

} // namespace velt::cli
