#include "cli/command.h"
#include "cli/failure.h"
#include "cli/json_io.h"
#include "cli/settings_document.h"
#include "cli/text_table.h"

#include <CLI/CLI.hpp>

#include <fstream>
#include <memory>
#include <ostream>

namespace velt::cli {

namespace {

struct DocumentOptions {
    std::string file;
    bool dryRun = false;
};

void exportTo(Context& context, const std::string& name) {
    const Json::Value document = exportSettings(context.api);
    if (name.empty()) {
        writeJson(context.console.out, document);
        return;
    }
    std::ofstream file(name, std::ios::binary | std::ios::trunc);
    writeJson(file, document);
    file.close();
    if (!file) {
        throw Failure(ExitCode::local, "The file " + name + " cannot be written.",
                      "Name a file in a folder where you may write, with space left.");
    }
}

Json::Value readDocument(Context& context, const std::string& name) {
    std::string problem;
    const std::optional<Json::Value> document = parseJson(readInput(context.console, name), problem);
    if (!document) {
        throw Failure(ExitCode::refused, name + " is not JSON.", "Correct it; nothing was changed.",
                      {problem});
    }
    const std::vector<std::string> faults = documentFaults(*document);
    if (!faults.empty()) {
        Failure failure(ExitCode::refused, name + " is no document of settings.",
                        "Correct it; nothing was changed. 'veltctl export' writes such a document.");
        for (const std::string& fault : faults) {
            failure.note(fault);
        }
        throw Failure(failure);
    }
    return *document;
}

void writeStep(Context& context, const ImportStep& step) {
    for (const std::string& change : step.changes) {
        context.console.out << step.section << "  " << change << '\n';
    }
    context.console.out.flush();
}

void writeResult(Context& context, const ImportPlan& plan, std::size_t applied, bool dryRun) {
    if (context.json) {
        Json::Value result;
        result["dry_run"] = dryRun;
        result["sections"] = Json::Value(Json::arrayValue);
        for (std::size_t i = 0; i < plan.steps.size(); ++i) {
            Json::Value section;
            section["section"] = plan.steps[i].section;
            section["changes"] = plan.steps[i].changesJson;
            section["applied"] = i < applied;
            result["sections"].append(section);
        }
        writeJson(context.console.out, result);
    } else if (plan.steps.empty()) {
        context.console.out << "Nothing to change.\n";
    } else if (dryRun) {
        context.console.out << "Nothing was changed: this was a dry run.\n";
    }
}

void applySteps(Context& context, const ImportPlan& plan) {
    std::size_t applied = 0;
    try {
        for (const ImportStep& step : plan.steps) {
            step.apply();
            ++applied;
            if (!context.json) {
                writeStep(context, step);
            }
        }
    } catch (Failure& failure) {
        failure.note("in the section " + plan.steps[applied].section);
        for (std::size_t i = 0; i < plan.steps.size(); ++i) {
            if (i != applied) {
                failure.note(plan.steps[i].section + (i < applied ? ": was applied" : ": was not applied"));
            }
        }
        writeResult(context, plan, applied, false);
        throw;
    }
    writeResult(context, plan, applied, false);
}

void importFrom(Context& context, const DocumentOptions& options) {
    const Json::Value document = readDocument(context, options.file);
    const ImportPlan plan = planImport(context.api, document);
    if (!options.dryRun) {
        applySteps(context, plan);
        return;
    }
    if (!context.json) {
        for (const ImportStep& step : plan.steps) {
            writeStep(context, step);
        }
    }
    writeResult(context, plan, 0, true);
}

} // namespace

void addDocumentCommands(CLI::App& app, Command& chosen) {
    auto options = std::make_shared<DocumentOptions>();
    CLI::App* save = app.add_subcommand("export", "Write all settings as one JSON document");
    save->add_option("-o,--output", options->file, "The file to write (default: the standard output)")
        ->type_name("FILE");
    save->callback(
        [&chosen, options] { chosen = [options](Context& context) { exportTo(context, options->file); }; });

    CLI::App* load =
        app.add_subcommand("import", "Bring the settings to those of a document, and say what changes");
    load->add_option("file", options->file, "The document, or - for the standard input")
        ->required()
        ->type_name("");
    load->add_flag("-n,--dry-run", options->dryRun, "Only say what would change");
    load->callback(
        [&chosen, options] { chosen = [options](Context& context) { importFrom(context, *options); }; });
}

} // namespace velt::cli
