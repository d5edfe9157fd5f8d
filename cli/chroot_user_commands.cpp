#include "base/json_value.h"
#include "cli/command.h"
#include "cli/failure.h"
#include "cli/json_io.h"
#include "cli/rule_change.h"
#include "cli/text_table.h"
#include "schema/settings_table.h"

#include <CLI/CLI.hpp>

#include <algorithm>
#include <iterator>
#include <memory>
#include <ostream>
#include <set>

namespace velt::cli {

namespace {

struct UserOptions {
    bool others = false;
    int offset = 0;
    int limit = -1;
    std::string source = "local";
    std::string domain;
    std::string filter;
    std::vector<std::string> names;
    ChangeOptions change;
};

/// What the list of users leaves out.
void writeGeneralSetting(std::ostream& out, bool others) {
    out << "user_chroot is on: "
        << (others ? "unless a rule says otherwise, these users are confined to their home folders, too.\n"
                   : "users without a rule are confined to their home folders, too.\n");
}

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
    Json::Value answer = context.api.call({chrootApi, 1, "list"}, parameters);
    const bool everybody = context.api.read({schema::security.api, 1, "get"})["user_chroot"] == true;
    answer["user_chroot"] = everybody;
    if (context.wroteJson(answer)) {
        return;
    }
    Table table({"USER", "DESCRIPTION"});
    for (const Json::Value& user : answer["user"]) {
        table.add({textAt(user, "name"), textAt(user, "descr")});
    }
    table.write(context.console.out);
    context.console.out << answer["user"].size() << " of " << textAt(answer, "total") << " users\n";
    if (everybody) {
        writeGeneralSetting(context.console.out, options.others);
    }
}

constexpr const char* home = "/home";

bool isFor(const ChrootRule& rule, const std::string& user) {
    return rule.type == "user" && rule.name == user;
}

/// A user has one rule, so another one gives way.
void confine(ChrootRules& rules, const std::string& user) {
    const auto isForUser = [&](const ChrootRule& rule) { return isFor(rule, user); };
    const auto first = std::ranges::find_if(rules, isForUser);
    if (first == rules.end()) {
        rules.push_back({"user", user, home});
        return;
    }
    first->path = home;
    rules.erase(std::remove_if(std::next(first), rules.end(), isForUser), rules.end());
}

// Failure when there is nothing to remove.
void release(ChrootRules& rules, const std::string& user, const Json::Value& settings) {
    if (std::erase(rules, ChrootRule{"user", user, home}) > 0) {
        return;
    }
    std::vector<std::string> notes{"Nothing was changed."};
    for (const ChrootRule& rule : rules) {
        if (isFor(rule, user)) {
            notes.push_back("The rule of this user is for " + rule.path + ".");
        }
    }
    if (confinesAll(settings)) {
        notes.emplace_back("user_chroot is on, which confines all users without a rule.");
    }
    throw Failure(ExitCode::refused,
                  "There is no rule that confines the user " + user + " to the home folder.",
                  "See 'veltctl chroot rules load' for the rules.", notes);
}

void confineUsers(Context& context, const UserOptions& options) {
    changeRules(context, options.change, [&](ChrootRules& rules, const Json::Value&) {
        for (const std::string& name : options.names) {
            confine(rules, name);
        }
    });
}

void releaseUsers(Context& context, const UserOptions& options) {
    bool everybody = false;
    const std::set<std::string> names(options.names.begin(), options.names.end());
    changeRules(context, options.change, [&](ChrootRules& rules, const Json::Value& settings) {
        for (const std::string& name : names) {
            release(rules, name, settings);
        }
        everybody = confinesAll(settings);
    });
    if (everybody && !context.json) {
        context.console.out
            << "user_chroot is on: users without a rule are confined to their home folders.\n";
    }
}

} // namespace

void addChrootUserCommands(CLI::App& chroot, Command& chosen) {
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

    CLI::App* add = users->add_subcommand("add", "Confine users to their home folders, instead of to others");
    CLI::App* remove =
        users->add_subcommand("delete", "Remove the rules that confine users to their home folders");
    for (CLI::App* command : {add, remove}) {
        addChangeOptions(command, options->change);
        command->add_option("user", options->names, "Name of a user, or several")->required()->type_name("");
    }
    onWords(add, chosen, [options](Context& context) { confineUsers(context, *options); });
    onWords(remove, chosen, [options](Context& context) { releaseUsers(context, *options); });
}

} // namespace velt::cli
