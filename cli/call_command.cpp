#include "cli/change_report.h"
#include "cli/command.h"
#include "cli/failure.h"
#include "cli/json_io.h"
#include "cli/text_table.h"

#include <CLI/CLI.hpp>

#include <memory>

namespace velt::cli {

namespace {

struct CallOptions {
    bool list = false;
    ApiMethod method{"", 0, ""};
    std::string parameters = "{}";
    ChangeOptions change;
};

void listMethods(Context& context) {
    const Json::Value answer = context.api.get("/api");
    if (context.wroteJson(answer)) {
        return;
    }
    Table table({"API", "VERSION", "METHOD", "CHANGES"});
    for (const Json::Value& row : answer["rows"]) {
        table.add({textAt(row, "api"), textAt(row, "version"), textAt(row, "method"),
                   row["read"] == true ? "no" : "yes"});
    }
    table.write(context.console.out);
}

void callMethod(Context& context, const CallOptions& options) {
    if (options.list) {
        listMethods(context);
        return;
    }
    if (options.method.method.empty()) {
        throw Failure(ExitCode::usage, "call needs an API, a version and a method.",
                      "See 'veltctl call --list' for the methods.");
    }
    const std::string text = options.parameters == "-" ? readInput(context.console, "-") : options.parameters;
    const auto parameters = parseJson(text);
    if (!parameters || !parameters->isObject()) {
        throw Failure(ExitCode::usage, "The parameters are not a JSON object.",
                      "Pass an object such as '{\"enable_ftp\": true}', quoted for the shell.",
                      {parameters ? "" : parameters.error().message});
    }
    const Json::Value answer = context.api.call(options.method, *parameters, options.change.query());
    if (answer.isObject() && answer["dry_run"] == true) {
        writeReport(context, answer);
    } else if (!answer.isNull()) {
        writeJson(context.console.out, answer);
    }
}

} // namespace

void addCallCommand(CLI::App& app, Command& chosen) {
    auto options = std::make_shared<CallOptions>();
    CLI::App* call = app.add_subcommand("call", "Call any method of any API and show its answer as JSON");
    call->add_flag("--list", options->list, "List the methods of the server");
    call->add_option("api", options->method.api, "Name of the API")->type_name("");
    call->add_option("version", options->method.version, "Version of the API")
        ->check(CLI::Range(1, 99))
        ->type_name("");
    call->add_option("method", options->method.method, "Name of the method")->type_name("");
    call->add_option("parameters", options->parameters, "A JSON object, or - for the standard input")
        ->type_name("");
    addChangeOptions(call, options->change);
    onWords(call, chosen, [options](Context& context) { callMethod(context, *options); });
}

} // namespace velt::cli
