#include "cli/command.h"
#include "cli/failure.h"
#include "cli/json_io.h"
#include "cli/rule_list.h"
#include "cli/text_table.h"

#include <CLI/CLI.hpp>

#include <algorithm>
#include <memory>

namespace velt::cli {

namespace {

struct RuleOptions {
    ChrootRule rule;
    std::string file;
};

void writeRules(Context& context, const ChrootRules& rules) {
    if (context.json) {
        Json::Value result;
        result["rules"] = rulesToJson(rules);
        writeJson(context.console.out, result);
        return;
    }
    Table table({"TYPE", "NAME", "DIRECTORY"});
    for (const ChrootRule& rule : rules) {
        table.add({rule.type, rule.name, rule.path});
    }
    table.write(context.console.out);
}

void showRules(Context& context) {
    const Json::Value answer = context.api.read({chrootApi, 2, "load"});
    if (context.json) {
        writeJson(context.console.out, answer);
        return;
    }
    Table table({"TYPE", "NAME", "DIRECTORY", "EXISTS"});
    for (const Json::Value& rule : answer["rules"]) {
        table.add({textAt(rule, "type"), textAt(rule, "name"), textAt(rule, "path"),
                   rule["path_exist"] == true ? "yes" : "no"});
    }
    table.write(context.console.out);
}

void replaceRules(Context& context, const RuleOptions& options) {
    std::string problem;
    const std::optional<Json::Value> document = parseJson(readInput(context.console, options.file), problem);
    if (!document) {
        throw Failure(ExitCode::refused, options.file + " is not JSON.", "Correct it; nothing was changed.",
                      {problem});
    }
    std::vector<std::string> faults;
    const Json::Value& array = document->isObject() ? (*document)["rules"] : *document;
    const ChrootRules rules = rulesFromJson(array, faults);
    if (!faults.empty()) {
        Failure failure(
            ExitCode::refused, options.file + " holds no valid set of rules.",
            "Correct it; nothing was changed. 'veltctl chroot rules load --json' shows the form.");
        for (const std::string& fault : faults) {
            failure.note(fault);
        }
        throw Failure(failure);
    }
    context.api.changeWhatWasRead([&] { saveRules(context.api, rules, loadRules(context.api)); });
    writeRules(context, rules);
}

void addRule(Context& context, const RuleOptions& options) {
    std::vector<std::string> faults;
    rulesFromJson(rulesToJson({options.rule}), faults);
    if (!faults.empty()) {
        throw Failure(ExitCode::usage, faults.front().substr(faults.front().find(": ") + 2) + ".",
                      "For example: veltctl chroot rules add user NAME /SHARE");
    }
    ChrootRules rules;
    context.api.changeWhatWasRead([&] {
        const ChrootRules before = loadRules(context.api);
        rules = before;
        if (std::find(rules.begin(), rules.end(), options.rule) == rules.end()) {
            rules.push_back(options.rule);
            saveRules(context.api, rules, before);
        }
    });
    writeRules(context, rules);
}

// The rules without those that the options name; Failure when there is none of these.
ChrootRules rulesWithout(ChrootRules rules, const ChrootRule& wanted) {
    const std::size_t removed = std::erase_if(rules, [&](const ChrootRule& rule) {
        return rule.type == wanted.type && rule.name == wanted.name &&
               (wanted.path.empty() || rule.path == wanted.path);
    });
    if (removed == 0) {
        const std::string place = wanted.path.empty() ? "" : " with the directory " + wanted.path;
        throw Failure(ExitCode::refused,
                      "There is no rule for the " + wanted.type + " " + wanted.name + place + ".",
                      "'veltctl chroot rules load' shows the rules. Nothing was changed.");
    }
    return rules;
}

void removeRule(Context& context, const RuleOptions& options) {
    ChrootRules rules;
    context.api.changeWhatWasRead([&] {
        const ChrootRules before = loadRules(context.api);
        rules = rulesWithout(before, options.rule);
        saveRules(context.api, rules, before);
    });
    writeRules(context, rules);
}

struct UserOptions {
    bool others = false;
    int offset = 0;
    int limit = -1;
    std::string source = "local";
    std::string domain;
    std::string filter;
    std::vector<std::string> names;
};

void listUsers(Context& context, const UserOptions& options) {
    Json::Value parameters;
    parameters["chroot"] = !options.others;
    parameters["offset"] = options.offset;
    parameters["limit"] = options.limit;
    parameters["type"] = options.source;
    if (!options.domain.empty()) {
        parameters["domain_name"] = options.domain;
    }
    if (!options.filter.empty()) {
        parameters["substr"] = options.filter;
    }
    const Json::Value answer = context.api.call({chrootApi, 1, "list"}, parameters);
    if (context.json) {
        writeJson(context.console.out, answer);
        return;
    }
    Table table({"USER", "DESCRIPTION"});
    for (const Json::Value& user : answer["user"]) {
        table.add({textAt(user, "name"), textAt(user, "descr")});
    }
    table.write(context.console.out);
    context.console.out << answer["user"].size() << " of " << textAt(answer, "total") << " users\n";
}

void changeUsers(Context& context, const UserOptions& options, const char* method, const char* sentence) {
    Json::Value parameters;
    for (const std::string& name : options.names) {
        parameters["id"].append(name);
    }
    const Json::Value answer = context.api.call({chrootApi, 1, method}, parameters);
    if (context.json) {
        writeJson(context.console.out, answer.isNull() ? parameters : answer);
        return;
    }
    for (const std::string& name : options.names) {
        context.console.out << printable(name) << sentence << '\n';
    }
}

void addUserCommands(CLI::App& chroot, Command& chosen) {
    auto options = std::make_shared<UserOptions>();
    CLI::App* users = chroot.add_subcommand("users", "Users who are confined to their home folders");
    users->require_subcommand(1);
    CLI::App* list = users->add_subcommand("list", "List the confined users");
    list->add_flag("--others", options->others, "List the users who are not confined");
    list->add_option("--offset", options->offset, "Index of the first user")->type_name("N");
    list->add_option("--limit", options->limit, "Number of users (default: all)")->type_name("N");
    list->add_option("--type", options->source, "Where the users come from (default local)")
        ->check(CLI::IsMember({"local", "domain", "ldap", "all"}))
        ->type_name("local|domain|ldap|all");
    list->add_option("--domain", options->domain, "Users of this domain")->type_name("NAME");
    list->add_option("--filter", options->filter, "Users whose name holds this text")->type_name("TEXT");
    list->callback(
        [&chosen, options] { chosen = [options](Context& context) { listUsers(context, *options); }; });

    CLI::App* add = users->add_subcommand("add", "Confine users to their home folders");
    CLI::App* remove = users->add_subcommand("delete", "Lift the confinement of users");
    for (CLI::App* command : {add, remove}) {
        command->add_option("user", options->names, "Names of users")->required()->type_name("");
    }
    add->callback([&chosen, options] {
        chosen = [options](Context& context) { changeUsers(context, *options, "add", ": confined"); };
    });
    remove->callback([&chosen, options] {
        chosen = [options](Context& context) {
            changeUsers(context, *options, "delete", ": no longer confined");
        };
    });
}

void addRuleCommands(CLI::App& chroot, Command& chosen) {
    auto options = std::make_shared<RuleOptions>();
    CLI::App* rules = chroot.add_subcommand("rules", "Directories that users and groups are confined to");
    rules->require_subcommand(1);
    CLI::App* load = rules->add_subcommand("load", "Show all rules");
    load->callback([&chosen] { chosen = showRules; });

    CLI::App* save = rules->add_subcommand("save", "Replace all rules by those of a JSON file");
    save->add_option("file", options->file, "The file, or - for the standard input")
        ->required()
        ->type_name("");
    save->callback(
        [&chosen, options] { chosen = [options](Context& context) { replaceRules(context, *options); }; });

    CLI::App* add = rules->add_subcommand("add", "Add a rule");
    CLI::App* remove = rules->add_subcommand("remove", "Remove the rules of a user or group");
    for (CLI::App* command : {add, remove}) {
        command->add_option("type", options->rule.type, "user or group")
            ->required()
            ->check(CLI::IsMember({"user", "group"}))
            ->type_name("");
        command->add_option("name", options->rule.name, "Name of the user or group")
            ->required()
            ->type_name("");
    }
    add->add_option("directory", options->rule.path, "/home, /SHARE or /SHARE/FOLDER")
        ->required()
        ->type_name("");
    remove->add_option("directory", options->rule.path, "Only the rule with this directory")->type_name("");
    add->callback(
        [&chosen, options] { chosen = [options](Context& context) { addRule(context, *options); }; });
    remove->callback(
        [&chosen, options] { chosen = [options](Context& context) { removeRule(context, *options); }; });
}

} // namespace

void addChrootCommands(CLI::App& app, Command& chosen) {
    CLI::App* chroot = app.add_subcommand("chroot", "Confine users and groups to directories");
    chroot->require_subcommand(1);
    addUserCommands(*chroot, chosen);
    addRuleCommands(*chroot, chosen);
}

} // namespace velt::cli
