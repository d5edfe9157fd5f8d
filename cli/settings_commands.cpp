#include "base/json_value.h"
#include "base/printable.h"
#include "cli/command.h"
#include "cli/current_settings.h"
#include "cli/failure.h"
#include "cli/json_io.h"
#include "cli/text_table.h"
#include "schema/setting_text.h"

#include <CLI/CLI.hpp>

#include <algorithm>
#include <memory>

namespace velt::cli {

namespace {

std::vector<SettingChange> differences(const SettingGroup& group, const Json::Value& before,
                                       const Json::Value& after) {
    std::vector<SettingChange> changes;
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

void writeChanges(Context& context, const std::vector<SettingChange>& changes, const Json::Value& after) {
    if (context.wroteJson(jsonObject({{"changed", jsonArray(changes, changeToJson)}, {"settings", after}}))) {
        return;
    }
    for (const SettingChange& change : changes) {
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
        failure.note("The change was accepted, but the new settings could not be read.");
        throw;
    }
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
    CurrentSettings before;
    context.api.changeWhatWasRead([&] {
        before = readCurrentSettings(context.api, group, wanted);
        context.api.call(group.method("set"), completeChange(group, wanted, before.stored));
    });
    const Json::Value after = readBack(context, group);
    writeChanges(context, differences(group, before.shown, after), after);
    for (const std::string& doubt : before.doubts) {
        context.console.err << "veltctl: warning: " << printable(doubt) << '\n';
    }
    warnOfKeptValues(context, wanted, after);
}

struct SettingsOptions {
    int version;
    std::vector<std::string> words;
};

std::string footerOf(const SettingGroup& group) {
    std::string text = "Settings:\n";
    for (const Setting& setting : group.settings) {
        const std::string key = setting.key;
        text += "  " + key + std::string(key.size() < 24 ? 24 - key.size() : 1, ' ') + setting.meaning +
                " (" + schema::valueFacts(setting, schema::onOff) + ")\n";
    }
    return text;
}

void addVersion(CLI::App* command, int& version, int newest) {
    const std::string last = std::to_string(newest);
    command
        ->add_option("--api-version", version, "Version of the API: 1 to " + last + " (default " + last + ")")
        ->check(CLI::Range(1, newest))
        ->type_name("N");
}

void addGroup(CLI::App& app, Command& chosen, const schema::SettingGroup& table) {
    const std::string title = table.title;
    const int newest = table.newestApiVersion;
    auto options = std::make_shared<SettingsOptions>(SettingsOptions{newest, {}});
    CLI::App* area = app.add_subcommand(table.name, "Read and change " + title);
    area->require_subcommand(1);
    CLI::App* get = area->add_subcommand("get", "Show " + title);
    CLI::App* set = area->add_subcommand("set", "Change " + title + "; what is not named keeps its value");
    // Newer parsers accept no "=" in the name of an argument.
    set->add_option("setting", options->words, "The settings to change")->required()->type_name("key=value");
    set->footer(footerOf(newestGroupOf(table)));
    if (newest > 1) {
        addVersion(get, options->version, newest);
        addVersion(set, options->version, newest);
    }
    onWords(get, chosen,
            [options, &table](Context& context) { showSettings(context, groupOf(table, options->version)); });
    onWords(set, chosen, [options, &table](Context& context) {
        changeSettings(context, groupOf(table, options->version), options->words);
    });
}

} // namespace

void addSettingsCommands(CLI::App& app, Command& chosen) {
    for (const schema::SettingGroup* table : schema::groups) {
        addGroup(app, chosen, *table);
    }
}

} // namespace velt::cli
