#include "cli/failure.h"
#include "cli/json_text.h"
#include "cli/session.h"
#include "cli/table.h"

#include <CLI/CLI.hpp>

#include <memory>
#include <ostream>

namespace velt::cli {

namespace {

struct TokenOptions {
    std::string name;
    std::string role = "viewer";
    std::string id;
};

void listTokens(Session& session) {
    const Json::Value answer = session.api.get("/api/tokens");
    if (session.json) {
        writeJson(session.console.out, answer);
        return;
    }
    Table table({"ID", "NAME", "ROLE", "CREATED"});
    for (const Json::Value& token : answer["tokens"]) {
        table.add(
            {textAt(token, "id"), textAt(token, "name"), textAt(token, "role"), textAt(token, "created")});
    }
    table.write(session.console.out);
}

void createToken(Session& session, const TokenOptions& options) {
    Json::Value body;
    body["name"] = options.name;
    body["role"] = options.role;
    const Json::Value token = session.api.post("/api/tokens", body);
    if (session.json) {
        writeJson(session.console.out, token);
        return;
    }
    // The token alone goes to the output, so that it can be put into a file or a variable.
    session.console.err << "Token " << printable(textAt(token, "id")) << " for "
                        << printable(textAt(token, "name")) << " (" << printable(textAt(token, "role"))
                        << "). It is shown only now; keep it safe:\n";
    session.console.out << printable(textAt(token, "token")) << '\n';
}

void deleteToken(Session& session, const TokenOptions& options) {
    session.api.remove("/api/tokens/" + percentEncode(options.id));
    if (session.json) {
        Json::Value result;
        result["deleted"] = options.id;
        writeJson(session.console.out, result);
        return;
    }
    session.console.out << "Token " << printable(options.id) << " is no longer valid.\n";
}

} // namespace

void addTokenCommands(CLI::App& app, Command& chosen) {
    auto options = std::make_shared<TokenOptions>();
    CLI::App* tokens = app.add_subcommand("tokens", "Manage the tokens for access over TCP");
    tokens->require_subcommand(1);

    CLI::App* list = tokens->add_subcommand("list", "List the tokens");
    list->callback([&chosen] { chosen = listTokens; });

    CLI::App* create = tokens->add_subcommand("create", "Make a token and show it, once");
    create->add_option("name", options->name, "What the token is for")->required()->type_name("");
    create->add_option("--role", options->role, "viewer may only read (default), admin may change everything")
        ->check(CLI::IsMember({"admin", "viewer"}))
        ->type_name("admin|viewer");
    create->callback(
        [&chosen, options] { chosen = [options](Session& session) { createToken(session, *options); }; });

    CLI::App* remove = tokens->add_subcommand("delete", "Make a token invalid");
    remove->add_option("id", options->id, "The id that 'tokens list' shows")->required()->type_name("");
    remove->callback(
        [&chosen, options] { chosen = [options](Session& session) { deleteToken(session, *options); }; });
}

} // namespace velt::cli
