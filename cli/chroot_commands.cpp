#include "base/json_value.h"
#include "base/printable.h"
#include "cli/change_report.h"
#include "cli/command.h"
#include "cli/failure.h"
#include "cli/json_io.h"
#include "cli/rule_list.h"
#include "cli/text_table.h"

#include <CLI/CLI.hpp>

#include <algorithm>
#include <functional>
#include <memory>

namespace velt::cli {

namespace {

struct RuleOptions {
    ChrootRule rule;
    std::string file;
    ChangeOptions change;
};

void showRules(Context& context) {
    const Json::Value answer = context.api.read({chrootApi, 2, "load"});
    if (context.wroteJson(answer)) {
        return;
    }
    Table table({"TYPE", "NAME", "FOLDER", "EXISTS"});
    for (const Json::Value& rule : answer["rules"]) {
        table.add({textAt(rule, "type"), textAt(rule, "name"), textAt(rule, "path"),
                   rule["path_exist"] == true ? "yes" : "no"});
    }
    table.write(context.console.out);
}

Json::Value patchOf(const ChrootRules& rules) {
    return jsonObject({{"chroot_rules", rulesToJson(rules)}});
}

void replaceRules(Context& context, const RuleOptions& options) {
    const Json::Value document = readJsonFile(context.console, options.file);
    std::vector<std::string> faults;
    const ChrootRules rules = rulesFromJson(document.isObject() ? document["rules"] : document, faults);
    if (!faults.empty()) {
        faults.emplace_back("Nothing was changed.");
        throw Failure(ExitCode::refused, "Invalid chroot rules in " + inputName(options.file) + ".",
                      "Correct them; 'veltctl chroot rules load --json' shows how rules are written.",
                      faults);
    }
    changeSettings(context, patchOf(rules), options.change);
}

/// Changes the rules that are stored; once more, when others change them meanwhile.
void changeRules(Context& context, const ChangeOptions& options,
                 const std::function<void(ChrootRules&)>& change) {
    Json::Value report;
    context.api.changeWhatWasRead([&] {
        ChrootRules rules = loadRules(context.api);
        change(rules);
        report = context.api.patch(settingsPath + options.query(), patchOf(rules));
    });
    writeReport(context, report);
}

void addRule(Context& context, const RuleOptions& options) {
    if (const auto fault = faultOf(options.rule)) {
        throw Failure(ExitCode::usage, "Invalid rule: " + *fault + ".",
                      "Write it as in 'veltctl chroot rules add user NAME /SHARE'.");
    }
    changeRules(context, options.change, [&](ChrootRules& rules) {
        if (std::ranges::find(rules, options.rule) == rules.end()) {
            rules.push_back(options.rule);
        }
    });
}

// Failure when there is nothing to remove.
void removeFrom(ChrootRules& rules, const ChrootRule& wanted) {
    const std::size_t removed = std::erase_if(rules, [&](const ChrootRule& rule) {
        return rule.type == wanted.type && rule.name == wanted.name &&
               (wanted.path.empty() || rule.path == wanted.path);
    });
    if (removed == 0) {
        const std::string folder = wanted.path.empty() ? "" : " with the folder " + wanted.path;
        throw Failure(ExitCode::refused,
                      "There is no rule for the " + wanted.type + " " + wanted.name + folder + ".",
                      "See 'veltctl chroot rules load' for the rules.");
    }
}

void removeRule(Context& context, const RuleOptions& options) {
    changeRules(context, options.change, [&](ChrootRules& rules) { removeFrom(rules, options.rule); });
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
    Json::Value parameters = jsonObject({{"chroot", !options.others},
                                         {"offset", options.offset},
                                         {"limit", options.limit},
                                         {"type", options.source}});
    if (!options.domain.empty()) {
        parameters["domain_name"] = options.domain;
    }
    if (!options.filter.empty()) {
        parameters["substr"] = options.filter;
    }
    const Json::Value answer = context.api.call({chrootApi, 1, "list"}, parameters);
    if (context.wroteJson(answer)) {
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
    const Json::Value parameters = jsonObject({{"id", jsonArray(options.names, std::identity())}});
    const Json::Value answer = context.api.call({chrootApi, 1, method}, parameters);
    if (context.wroteJson(answer.isNull() ? parameters : answer)) {
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
    list->add_option("--offset", options->offset, "Number of users to skip")->type_name("N");
    list->add_option("--limit", options->limit, "Number of users to list (default: all)")->type_name("N");
    list->add_option("--type", options->source, "Where the users come from (default local)")
        ->check(CLI::IsMember({"local", "domain", "ldap", "all"}))
        ->type_name("local|domain|ldap|all");
    list->add_option("--domain", options->domain, "Only users of this domain")->type_name("NAME");
    list->add_option("--filter", options->filter, "Only users whose name contains this text")
        ->type_name("TEXT");
    onWords(list, chosen, [options](Context& context) { listUsers(context, *options); });

    CLI::App* add = users->add_subcommand("add", "Confine users to their home folders");
    CLI::App* remove = users->add_subcommand("delete", "Stop confining users to their home folders");
    for (CLI::App* command : {add, remove}) {
        command->add_option("user", options->names, "Name of a user, or several")->required()->type_name("");
    }
    onWords(add, chosen,
            [options](Context& context) { changeUsers(context, *options, "add", ": confined"); });
    onWords(remove, chosen, [options](Context& context) {
        changeUsers(context, *options, "delete", ": no longer confined");
    });
}

void addRuleCommands(CLI::App& chroot, Command& chosen) {
    auto options = std::make_shared<RuleOptions>();
    CLI::App* rules = chroot.add_subcommand("rules", "Folders that users and groups are confined to");
    rules->require_subcommand(1);
    CLI::App* load = rules->add_subcommand("load", "Show all rules");
    onWords(load, chosen, showRules);

    CLI::App* save = rules->add_subcommand("save", "Replace all rules with those of a JSON file");
    save->add_option("file", options->file, "The file, or - for the standard input")
        ->required()
        ->type_name("");
    onWords(save, chosen, [options](Context& context) { replaceRules(context, *options); });

    CLI::App* add = rules->add_subcommand("add", "Add a rule");
    CLI::App* remove = rules->add_subcommand("remove", "Remove the rules of a user or group");
    addChangeOptions(save, options->change);
    for (CLI::App* command : {add, remove}) {
        addChangeOptions(command, options->change);
        command->add_option("type", options->rule.type, "user or group")
            ->required()
            ->check(CLI::IsMember({"user", "group"}))
            ->type_name("");
        command->add_option("name", options->rule.name, "Name of the user or group")
            ->required()
            ->type_name("");
    }
    add->add_option("folder", options->rule.path, "/home, /SHARE or /SHARE/FOLDER")
        ->required()
        ->type_name("");
    remove->add_option("folder", options->rule.path, "Only the rule with this folder")->type_name("");
    onWords(add, chosen, [options](Context& context) { addRule(context, *options); });
    onWords(remove, chosen, [options](Context& context) { removeRule(context, *options); });
}

} // namespace

void addChrootCommands(CLI::App& app, Command& chosen) {
    CLI::App* chroot = app.add_subcommand("chroot", "Confine users and groups to folders");
    chroot->require_subcommand(1);
    addUserCommands(*chroot, chosen);
    addRuleCommands(*chroot, chosen);
}

} // namespace velt::cli
