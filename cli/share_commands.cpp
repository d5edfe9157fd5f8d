#include "cli/json_text.h"
#include "cli/session.h"
#include "cli/table.h"

#include <CLI/CLI.hpp>

namespace velt::cli {

namespace {

void listShares(Session& session) {
    const Json::Value answer = session.api.read({securityApi, 1, "list_ftp_share"});
    if (session.json) {
        writeJson(session.console.out, answer);
        return;
    }
    Table table({"SHARE"});
    for (const Json::Value& share : answer["share"]) {
        table.add({displayValue(share)});
    }
    table.write(session.console.out);
}

} // namespace

void addShareCommands(CLI::App& app, Command& chosen) {
    CLI::App* shares = app.add_subcommand("shares", "List the shares that are offered to FTP");
    shares->callback([&chosen] { chosen = listShares; });
}

} // namespace velt::cli
