#include "base/json_value.h"
#include "base/number_text.h"
#include "base/printable.h"
#include "cli/change_report.h"
#include "cli/command.h"
#include "cli/json_io.h"
#include "cli/text_table.h"

#include <CLI/CLI.hpp>

#include <memory>
#include <ostream>
#include <string>
#include <vector>

namespace velt::cli {

namespace {

struct HistoryOptions {
    long long id = 0; ///< 0: the newest
    long long before = 0;
    int limit = 20;
    ChangeOptions change;
};

/// "/ftp/timeout, /ftp/portnum", or "/ftp/timeout and 7 more".
std::string fieldsOf(const Json::Value& changes) {
    constexpr Json::ArrayIndex most = 3;
    std::string text;
    for (Json::ArrayIndex i = 0; i < changes.size() && i < most; ++i) {
        text += (i == 0 ? "" : ", ") + textAt(changes[i], "field");
    }
    return changes.size() > most ? text + " and " + std::to_string(changes.size() - most) + " more" : text;
}

void showHistory(Context& context, const HistoryOptions& options) {
    std::string query = "?limit=" + std::to_string(options.limit);
    query += options.before > 0 ? "&before=" + std::to_string(options.before) : "";
    const Json::Value answer = context.api.get("/api/history" + query);
    if (context.wroteJson(answer)) {
        return;
    }
    Table table({"ID", "TIME", "STATE", "BY", "WITH", "CHANGED"});
    for (const Json::Value& change : answer["changes"]) {
        const std::string actor = textAt(change, "actor");
        table.add({change["id"].asString(), textAt(change, "time"), textAt(change, "state"),
                   actor.empty() ? "veltd" : actor, textAt(change, "way"), fieldsOf(change["changes"])});
    }
    table.write(context.console.out);
    if (answer["next"].isIntegral()) {
        context.console.out << "Older ones: veltctl history --before " << answer["next"].asString() << '\n';
    }
}

void showChange(Context& context, long long id) {
    const Json::Value change = context.api.get("/api/history/" + std::to_string(id));
    if (context.wroteJson(change)) {
        return;
    }
    Table table({"FIELD", "FROM", "TO"});
    for (const Json::Value& field : change["changes"]) {
        const auto text = [&](const char* key) {
            return field[key].isArray() ? compactJson(field[key]) : displayValue(field[key]);
        };
        table.add({textAt(field, "field"), text("from"), text("to")});
    }
    table.write(context.console.out);
}

/// The newest changes of which one may be meant.
template<class Condition> std::vector<long long> candidates(Context& context, const Condition& condition) {
    const Json::Value answer = context.api.get("/api/history?limit=100");
    std::vector<long long> found;
    for (const Json::Value& change : answer["changes"]) {
        if (condition(textAt(change, "state"))) {
            found.push_back(change["id"].asInt64());
        }
    }
    return found;
}

Failure noChange(const char* what) {
    return {ExitCode::refused, std::string("There is no change ") + what + ".",
            "'veltctl history' lists the changes."};
}

long long changeToUndo(Context& context) {
    const auto found = candidates(context, [](const std::string& state) {
        return state != "undone" && state != "begun"; // of the latter nobody knows yet whether it was done
    });
    return found.empty() ? throw noChange("to undo") : found.front();
}

long long changeToConfirm(Context& context) {
    const auto found = candidates(context, [](const std::string& state) { return state == "waiting"; });
    if (found.size() > 1) { // whoever sees one of them would let the others be taken back
        std::string ids;
        for (const long long id : found) {
            ids += (ids.empty() ? "" : ", ") + std::to_string(id);
        }
        throw Failure(ExitCode::refused, "Several changes wait for their confirmation: " + ids + ".",
                      "Name the one to keep: veltctl confirm " + std::to_string(found.front()));
    }
    return found.empty() ? throw noChange("to confirm") : found.front();
}

void undo(Context& context, const HistoryOptions& options) {
    const long long id = options.id > 0 ? options.id : changeToUndo(context);
    const std::string path = "/api/history/" + std::to_string(id) + "/undo" + options.change.query();
    writeReport(context, context.api.post(path, Json::objectValue));
}

void confirm(Context& context, const HistoryOptions& options) {
    const long long id = options.id > 0 ? options.id : changeToConfirm(context);
    const Json::Value answer = context.api.post("/api/history/" + std::to_string(id) + "/confirm" +
                                                    dryRunQuery(options.change.dryRun),
                                                Json::objectValue);
    if (options.change.dryRun) {
        writeReport(context, answer);
    } else if (!context.wroteJson(jsonObject({{"confirmed", Json::Int64{id}}}))) {
        context.console.out << "Change " << id << " stays.\n";
    }
}

std::string faultOfId(const std::string& text) {
    return parseNumber(text).value_or(0) > 0
               ? ""
               : "\"" + printable(text) +
                     "\": expected the number of a change, as 'veltctl history' lists them";
}

void addId(CLI::App* command, HistoryOptions& options, const char* text) {
    command->add_option("id", options.id, text)->check(CLI::Validator(faultOfId, ""))->type_name("");
}

} // namespace

void addHistoryCommands(CLI::App& app, Command& chosen) {
    auto options = std::make_shared<HistoryOptions>();
    CLI::App* list = app.add_subcommand("history", "Show the changes of the settings, or one of them");
    addId(list, *options, "Show this change field by field");
    list->add_option("--before", options->before, "Only changes older than this one")
        ->check(CLI::Validator(faultOfId, ""))
        ->type_name("ID");
    list->add_option("--limit", options->limit, "Number of changes to show (default 20)")
        ->check(CLI::Range(1, 1000))
        ->type_name("N");
    onWords(list, chosen, [options](Context& context) {
        options->id > 0 ? showChange(context, options->id) : showHistory(context, *options);
    });

    CLI::App* back = app.add_subcommand("undo", "Take a change of the settings back");
    addId(back, *options, "The change that 'veltctl history' shows (default: the newest)");
    addChangeOptions(back, options->change);
    onWords(back, chosen, [options](Context& context) { undo(context, *options); });

    CLI::App* keep = app.add_subcommand("confirm", "Keep a change that else is taken back");
    addId(keep, *options, "The change (default: the one that waits)");
    addDryRun(keep, options->change.dryRun);
    onWords(keep, chosen, [options](Context& context) { confirm(context, *options); });
}

} // namespace velt::cli
