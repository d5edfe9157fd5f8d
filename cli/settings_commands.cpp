#include "base/json_value.h"
#include "cli/change_report.h"
#include "cli/command.h"
#include "cli/json_io.h"
#include "cli/server_refusal.h"
#include "cli/setting.h"
#include "cli/text_table.h"
#include "schema/setting_text.h"

#include <CLI/CLI.hpp>

#include <algorithm>
#include <memory>
#include <ostream>

namespace velt::cli {

namespace {

/// What a "get" answers. Failure when it is no object, or lacks a switch.
Json::Value readSettings(ApiClient& api, const SettingGroup& group) {
    Json::Value shown =
        group.version == 0 ? api.get("/api/settings")[group.command] : api.read(group.method("get"));
    const auto missing = [&](const Setting& setting) {
        return setting.service != nullptr && !hasType(shown[setting.key], setting.type);
    };
    if (!shown.isObject() || std::ranges::any_of(group.settings, missing)) {
        throw unexpectedAnswer(std::string("The server's answer contains no ") + group.command +
                               " settings.");
    }
    return shown;
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

/// A range has no effect without its switch.
Json::Value withItsSwitch(Json::Value wanted) {
    if (wanted.isMember("custom_port") && !wanted.isMember("custom_port_range")) {
        wanted["custom_port_range"] = true;
    }
    return wanted;
}

struct SettingsOptions {
    int version;
    std::vector<std::string> words;
    ChangeOptions change;
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
    auto options = std::make_shared<SettingsOptions>(SettingsOptions{newest, {}, {}});
    CLI::App* area = app.add_subcommand(table.name, "Read and change " + title);
    area->require_subcommand(1);
    CLI::App* get = area->add_subcommand("get", "Show " + title);
    CLI::App* set = area->add_subcommand("set", "Change " + title + "; what is not named keeps its value");
    // Newer parsers accept no "=" in the name of an argument.
    set->add_option("setting", options->words, "The settings to change")->required()->type_name("key=value");
    set->footer(footerOf(newestGroupOf(table)));
    if (newest > 1) {
        addVersion(get, options->version, newest);
    }
    onWords(get, chosen,
            [options, &table](Context& context) { showSettings(context, groupOf(table, options->version)); });
    addChangeOptions(set, options->change);
    onWords(set, chosen, [options, &table](Context& context) {
        const Json::Value wanted = withItsSwitch(parseAssignments(newestGroupOf(table), options->words));
        changeSettings(context, jsonObject({{table.name, wanted}}), options->change, table.name);
    });
}

} // namespace

void addSettingsCommands(CLI::App& app, Command& chosen) {
    for (const schema::SettingGroup* table : schema::groups) {
        addGroup(app, chosen, *table);
    }
}

} // namespace velt::cli
