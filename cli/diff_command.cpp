#include "base/json_value.h"
#include "base/number_text.h"
#include "cli/change_report.h"
#include "cli/command.h"
#include "cli/json_io.h"

#include <CLI/CLI.hpp>

#include <memory>
#include <ostream>
#include <string>

namespace velt::cli {

namespace {

constexpr const char* now = "now";

struct DiffOptions {
    std::string from;
    std::string to = now;
};

/// What the word of the command stands for: the id of a change, "now", or a document.
Json::Value stateNamed(Context& context, const std::string& word) {
    if (word == now) {
        return word;
    }
    if (const auto id = parseNumber(word)) {
        return Json::Int64{*id};
    }
    return readJsonFile(context.console, word);
}

void diff(Context& context, const DiffOptions& options) {
    const Json::Value from = stateNamed(context, options.from);
    const Json::Value to = stateNamed(context, options.to);
    const Json::Value answer = context.api.post("/api/diff", jsonObject({{"from", from}, {"to", to}}));
    const bool differ = !answer["changes"].empty();
    if (differ) {
        context.exitCode = ExitCode::wouldChange;
    }
    if (context.wroteJson(answer)) {
        return;
    }
    writeChanges(context.console.out, answer["changes"]);
    if (!differ) {
        context.console.out << "No difference.\n";
    }
}

} // namespace

void addDiffCommand(CLI::App& app, Command& chosen) {
    auto options = std::make_shared<DiffOptions>();
    CLI::App* command = app.add_subcommand("diff", "Show what differs between two states of the settings");
    command
        ->add_option("from", options->from,
                     "The id of a change (the settings right after it), now, a file that 'veltctl export' "
                     "wrote, or - for standard input")
        ->required()
        ->type_name("");
    command->add_option("to", options->to, "The same (default now)")->type_name("");
    onWords(command, chosen, [options](Context& context) { diff(context, *options); });
}

} // namespace velt::cli
