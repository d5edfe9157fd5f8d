#include "base/json_value.h"
#include "base/printable.h"
#include "base/text.h"
#include "cli/change_report.h"
#include "cli/command.h"
#include "cli/failure.h"
#include "cli/json_io.h"
#include "cli/key_import.h"
#include "cli/request_query.h"
#include "cli/text_table.h"

#include <CLI/CLI.hpp>

#include <memory>
#include <ostream>
#include <string>
#include <vector>

namespace velt::cli {

namespace {

constexpr const char* examples = "Examples:\n"
                                 "  veltctl keys add anna id_ed25519.pub\n"
                                 "  veltctl keys add anna 'from=\"192.0.2.0/24\" ssh-ed25519 AAAA... desk'\n"
                                 "  veltctl keys import anna /home/anna/.ssh/authorized_keys\n"
                                 "  veltctl keys remove anna desk";

struct KeyOptions {
    std::string user;
    std::vector<std::string> key;
    std::string file;
    bool dryRun = false;
};

Json::Value readKeys(Context& context, const std::string& user) {
    RequestQuery query;
    query.add("user", user);
    return context.api.get("/api/keys" + query.text());
}

void listKeys(Context& context, const KeyOptions& options) {
    const Json::Value answer = readKeys(context, options.user);
    if (context.wroteJson(answer)) {
        return;
    }
    Table table(
        {"USER", "FINGERPRINT", "TYPE", "BITS", "COMMENT", "FROM", "EXPIRES", "STATE", "ADDED", "BY"});
    for (const Json::Value& key : answer["keys"]) {
        std::vector<std::string> cells;
        for (const char* name :
             {"user", "fingerprint", "type", "bits", "comment", "from", "expires", "state", "added", "by"}) {
            cells.push_back(textAt(key, name));
        }
        table.add(std::move(cells));
    }
    table.write(context.console.out);
    for (const Json::Value& sentence : answer["damaged"]) {
        context.console.err << printable(sentence.asString()) << '\n';
    }
}

/// The key that the words are, or that stands alone in the file that they name.
std::string keyIn(Context& context, const std::vector<std::string>& words) {
    std::string text;
    for (const std::string& word : words) {
        text += (text.empty() ? "" : " ") + word;
    }
    if (trimmed(text).find_first_of(" \t") != std::string_view::npos) {
        return text;
    }
    const std::string file = text.empty() ? "-" : text;
    const auto lines = keyLinesIn(readInput(context.console, file));
    if (lines.size() != 1) {
        throw Failure(ExitCode::usage,
                      "Expected one key in " + inputName(file) + ", not " + std::to_string(lines.size()) +
                          ".",
                      "'veltctl keys import' adds all keys of a file.");
    }
    return lines.front().text;
}

void addOne(Context& context, const KeyOptions& options) {
    const Json::Value key =
        addKey(context, options.user, keyIn(context, options.key), dryRunQuery(options.dryRun));
    if (options.dryRun) {
        writeReport(context, key);
    } else if (!context.wroteJson(key)) {
        context.console.out << printable(options.user) << " can log in over SFTP with the key "
                            << printable(textAt(key, "fingerprint")) << ".\n";
    }
}

/// What the user's only key with this comment has.
std::string fingerprintBy(Context& context, const std::string& user, const std::string& comment) {
    const Json::Value answer = readKeys(context, user);
    std::vector<std::string> found;
    for (const Json::Value& key : answer["keys"]) {
        if (textAt(key, "comment") == comment) {
            found.push_back(textAt(key, "fingerprint"));
        }
    }
    if (found.size() == 1) {
        return found.front();
    }
    const std::string number = found.empty() ? "no key" : std::to_string(found.size()) + " keys";
    throw Failure(ExitCode::refused, user + " has " + number + " with the comment \"" + comment + "\".",
                  "Name the key by its fingerprint; 'veltctl keys list' shows it.", found);
}

void removeOne(Context& context, const KeyOptions& options) {
    const std::string& name = options.key.front();
    const std::string fingerprint =
        name.starts_with("SHA256:") ? name : fingerprintBy(context, options.user, name);
    const Json::Value answer = context.api.remove("/api/keys/" + percentEncode(options.user) + "/" +
                                                  percentEncode(fingerprint) + dryRunQuery(options.dryRun));
    if (options.dryRun) {
        writeReport(context, answer);
    } else if (!context.wroteJson(jsonObject({{"user", options.user}, {"removed", fingerprint}}))) {
        context.console.out << "The key " << printable(fingerprint) << " of " << printable(options.user)
                            << " is removed.\n";
    }
}

} // namespace

void addKeyCommands(CLI::App& app, Command& chosen) {
    auto options = std::make_shared<KeyOptions>();
    CLI::App* keys = app.add_subcommand("keys", "Manage the public keys with which users log in over SFTP");
    keys->require_subcommand(1);
    keys->footer(examples);

    CLI::App* list = keys->add_subcommand("list", "List the keys of all users, or of one");
    list->add_option("user", options->user, "The user")->type_name("");
    onWords(list, chosen, [options](Context& context) { listKeys(context, *options); });

    CLI::App* add = keys->add_subcommand("add", "Add a key");
    CLI::App* remove = keys->add_subcommand("remove", "Remove a key");
    CLI::App* load = keys->add_subcommand("import", "Add all keys of an authorized_keys file");
    for (CLI::App* command : {add, remove, load}) {
        command->add_option("user", options->user, "The user")->required()->type_name("");
        command->footer(examples);
    }
    add->add_option("key", options->key,
                    "The key as in a file id_ed25519.pub, or such a file, or - for standard input (default)")
        ->type_name("");
    remove->add_option("key", options->key, "The fingerprint that 'keys list' shows, or the comment")
        ->required()
        ->expected(1)
        ->type_name("");
    load->add_option("file", options->file, "The file, or - for standard input")->required()->type_name("");
    for (CLI::App* command : {add, remove, load}) {
        addDryRun(command, options->dryRun);
    }
    onWords(add, chosen, [options](Context& context) { addOne(context, *options); });
    onWords(remove, chosen, [options](Context& context) { removeOne(context, *options); });
    onWords(load, chosen, [options](Context& context) {
        importKeys(context, options->user, options->file, options->dryRun);
    });
}

} // namespace velt::cli
