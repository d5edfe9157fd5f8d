#include "cli/settings_commands.h"

#include "cli/failure.h"
#include "cli/json_io.h"
#include "cli/printable.h"
#include "cli/server_refusal.h"
#include "cli/text_table.h"
#include "cli/wanted_services.h"

#include <CLI/CLI.hpp>

#include <algorithm>
#include <memory>

namespace velt::cli {

namespace {

std::vector<Change> differences(const SettingGroup& group, const Json::Value& before,
                                const Json::Value& after) {
    std::vector<Change> changes;
    for (const Setting& setting : group.settings) {
        if (before[setting.key] != after[setting.key]) {
            changes.push_back({setting.key, before[setting.key], after[setting.key]});
        }
    }
    return changes;
}

// The server accepts some values without effect, such as a UTF-8 switch without UTF-8 support.
void warnOfKeptValues(Context& context, const Json::Value& wanted, const Json::Value& after) {
    for (const std::string& key : wanted.getMemberNames()) {
        if (after[key] != wanted[key]) {
            context.console.err << "veltctl: warning: the server accepted " << key << "="
                                << printable(displayValue(wanted[key])) << ", but shows "
                                << printable(displayValue(after[key])) << ".\n";
        }
    }
}

void writeChanges(Context& context, const std::vector<Change>& changes, const Json::Value& after) {
    Json::Value result;
    result["changed"] = Json::Value(Json::arrayValue);
    for (const Change& change : changes) {
        result["changed"].append(changeToJson(change));
    }
    result["settings"] = after;
    if (context.wroteJson(result)) {
        return;
    }
    for (const Change& change : changes) {
        context.console.out << changeToText(change) << '\n';
    }
    if (changes.empty()) {
        context.console.out << "Nothing changed.\n";
    }
}

Json::Value readBack(Context& context, const SettingGroup& group) {
    try {
        return readSettings(context.api, group);
    } catch (Failure& failure) {
        failure.note("The change was accepted; only reading the new settings failed.");
        throw;
    }
}

struct SettingsOptions {
    int version = newestFtpVersion;
    std::vector<std::string> words;
};

std::string footerOf(const SettingGroup& group) {
    std::string text = "Settings:\n";
    for (const Setting& setting : group.settings) {
        const std::string key = setting.key;
        text += "  " + key + std::string(key.size() < 24 ? 24 - key.size() : 1, ' ') + setting.meaning +
                " (" + describe(setting.type) + ")\n";
    }
    return text;
}

void addGroup(CLI::App& app, Command& chosen, const std::string& title,
              const std::function<SettingGroup(int)>& groupOf) {
    const SettingGroup group = groupOf(newestFtpVersion);
    const bool versioned = group.version > 1;
    auto options = std::make_shared<SettingsOptions>();
    CLI::App* area = app.add_subcommand(group.command, "Read and change " + title);
    area->require_subcommand(1);
    CLI::App* get = area->add_subcommand("get", "Show " + title);
    CLI::App* set = area->add_subcommand("set", "Change " + title + "; what is not named keeps its value");
    // Newer parsers accept no "=" in the name of an argument.
    set->add_option("setting", options->words, "The settings to change")->required()->type_name("key=value");
    set->footer(footerOf(group));
    if (versioned) {
        for (CLI::App* command : {get, set}) {
            command
                ->add_option("--api-version", options->version, "Version of the API: 1, 2 or 3 (default 3)")
                ->check(CLI::Range(1, newestFtpVersion))
                ->type_name("N");
        }
    }
    onWords(get, chosen,
            [options, groupOf](Context& context) { showSettings(context, groupOf(options->version)); });
    onWords(set, chosen, [options, groupOf](Context& context) {
        changeSettings(context, groupOf(options->version), options->words);
    });
}

} // namespace

Json::Value readSettings(ApiClient& api, const SettingGroup& group) {
    Json::Value current = api.read(group.method("get"));
    const auto missing = [&](const Setting& setting) {
        return setting.service != nullptr && !hasType(current[setting.key], setting.type);
    };
    if (!current.isObject() || std::any_of(group.settings.begin(), group.settings.end(), missing)) {
        throw unexpectedAnswer(std::string("The server's answer contains no ") + group.command +
                               " settings.");
    }
    return current;
}

void showSettings(Context& context, const SettingGroup& group) {
    const Json::Value current = readSettings(context.api, group);
    if (context.wroteJson(current)) {
        return;
    }
    Table table({"SETTING", "VALUE", "MEANING"});
    for (const Setting& setting : group.settings) {
        if (current.isMember(setting.key)) {
            table.add({setting.key, displayValue(current[setting.key]), setting.meaning});
        }
    }
    table.write(context.console.out);
}

void changeSettings(Context& context, const SettingGroup& group, const std::vector<std::string>& words) {
    const Json::Value wanted = parseAssignments(group, words);
    Json::Value before;
    std::vector<std::string> doubts;
    context.api.changeWhatWasRead([&] {
        before = readSettings(context.api, group);
        const StoredSwitches switches = readStoredSwitches(context.api, group, wanted, before);
        doubts = switches.doubts;
        context.api.call(group.method("set"), completeChange(group, wanted, switches.values));
    });
    const Json::Value after = readBack(context, group);
    writeChanges(context, differences(group, before, after), after);
    for (const std::string& doubt : doubts) {
        context.console.err << "veltctl: warning: " << printable(doubt) << '\n';
    }
    warnOfKeptValues(context, wanted, after);
}

Json::Value changeToJson(const Change& change) {
    Json::Value result;
    result["key"] = change.key;
    result["from"] = change.from;
    result["to"] = change.to;
    return result;
}

std::string changeToText(const Change& change) {
    const auto shown = [](const Json::Value& value) {
        const std::string text = displayValue(value);
        return text.empty() ? std::string("(empty)") : printable(text);
    };
    return change.key + ": " + shown(change.from) + " -> " + shown(change.to);
}

void addSettingsCommands(CLI::App& app, Command& chosen) {
    addGroup(app, chosen, "the FTP and FTPS settings", ftpSettings);
    addGroup(app, chosen, "the security settings of FTP", [](int) { return securitySettings(); });
    addGroup(app, chosen, "the SFTP settings", [](int) { return sftpSettings(); });
}

} // namespace velt::cli
