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

namespace velt::cli {

namespace {

struct TokenOptions {
    std::string name;
    std::string role = "viewer";
    std::string id;
    bool dryRun = false;
};

void listTokens(Context& context) {
    const Json::Value answer = context.api.get("/api/tokens");
    if (context.wroteJson(answer)) {
        return;
    }
    Table table({"ID", "NAME", "ROLE", "CREATED"});
    for (const Json::Value& token : answer["tokens"]) {
        table.add(
            {textAt(token, "id"), textAt(token, "name"), textAt(token, "role"), textAt(token, "created")});
    }
    table.write(context.console.out);
}

void createToken(Context& context, const TokenOptions& options) {
    const Json::Value token = context.api.post("/api/tokens" + dryRunQuery(options.dryRun),
                                               jsonObject({{"name", options.name}, {"role", options.role}}));
    if (options.dryRun) {
        writeReport(context, token);
        return;
    }
    if (context.wroteJson(token)) {
        return;
    }
    // Only the token goes to the output, so that it can be put into a file or a variable.
    context.console.err << "Token " << printable(textAt(token, "id")) << " for "
                        << printable(textAt(token, "name")) << " (" << printable(textAt(token, "role"))
                        << "). It is shown only once; keep it safe:\n";
    context.console.out << printable(textAt(token, "token")) << '\n';
}

void deleteToken(Context& context, const TokenOptions& options) {
    const Json::Value answer =
        context.api.remove("/api/tokens/" + percentEncode(options.id) + dryRunQuery(options.dryRun));
    if (options.dryRun) {
        writeReport(context, answer);
    } else if (!context.wroteJson(jsonObject({{"deleted", options.id}}))) {
        context.console.out << "Token " << printable(options.id) << " is no longer valid.\n";
    }
}

} // namespace

void addTokenCommands(CLI::App& app, Command& chosen) {
    auto options = std::make_shared<TokenOptions>();
    CLI::App* tokens = app.add_subcommand("tokens", "Manage the tokens for access over TCP");
    tokens->require_subcommand(1);

    CLI::App* list = tokens->add_subcommand("list", "List the tokens");
    onWords(list, chosen, listTokens);

    CLI::App* create = tokens->add_subcommand("create", "Create a token and show it once");
    create->add_option("name", options->name, "What the token is for")->required()->type_name("");
    create->add_option("--role", options->role, "viewer may only read (default), admin may change everything")
        ->check(CLI::IsMember({"admin", "viewer"}))
        ->type_name("admin|viewer");
    addDryRun(create, options->dryRun);
    onWords(create, chosen, [options](Context& context) { createToken(context, *options); });

    CLI::App* remove = tokens->add_subcommand("delete", "Delete a token, so that it is no longer valid");
    remove->add_option("id", options->id, "The id that 'tokens list' shows")->required()->type_name("");
    addDryRun(remove, options->dryRun);
    onWords(remove, chosen, [options](Context& context) { deleteToken(context, *options); });
}

} // namespace velt::cli
