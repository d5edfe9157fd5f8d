#include "base/json_value.h"
#include "cli/command.h"
#include "cli/failure.h"
#include "cli/json_io.h"
#include "cli/rule_change.h"
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
    ChangeOptions change;
};

/// All rules: with their folders, as far as the module can name the accounts; the others are there by number.
Json::Value readRules(Context& context) {
    Json::Value rules = context.api.get(settingsPath)["chroot_rules"];
    const Json::Value named = context.api.read({chrootApi, 2, "load"})["rules"];
    Json::ArrayIndex next = 0;
    for (Json::Value& rule : rules) {
        const bool isNext = next < named.size() && named[next]["type"] == rule["type"] &&
                            named[next]["name"] == rule["name"] && named[next]["path"] == rule["path"];
        if (isNext) {
            rule = named[next++];
        }
    }
    return jsonObject({{"total", rules.size()}, {"rules", rules}});
}

void showRules(Context& context) {
    const Json::Value answer = readRules(context);
    if (context.wroteJson(answer)) {
        return;
    }
    Table table({"TYPE", "NAME", "FOLDER", "EXISTS"});
    for (const Json::Value& rule : answer["rules"]) {
        const char* const exists = rule["path_exist"] == true ? "yes" : "no";
        table.add({textAt(rule, "type"), textAt(rule, "name"), textAt(rule, "path"),
                   rule.isMember("path_exist") ? exists : "account unknown"});
    }
    table.write(context.console.out);
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
    changeSettings(context, jsonObject({{"chroot_rules", rulesToJson(rules)}}), options.change);
}

void addRule(Context& context, const RuleOptions& options) {
    if (const auto fault = faultOf(options.rule)) {
        throw Failure(ExitCode::usage, "Invalid rule: " + *fault + ".",
                      "Write it as in 'veltctl chroot rules add user NAME /SHARE'.");
    }
    changeRules(context, options.change, [&](ChrootRules& rules, const Json::Value&) {
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
    changeRules(context, options.change,
                [&](ChrootRules& rules, const Json::Value&) { removeFrom(rules, options.rule); });
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
    addChrootUserCommands(*chroot, chosen);
    addRuleCommands(*chroot, chosen);
}

} // namespace velt::cli
