#include "base/file.h"
#include "base/json_value.h"
#include "cli/command.h"
#include "cli/failure.h"
#include "cli/json_io.h"
#include "cli/settings_document.h"

#include <CLI/CLI.hpp>

#include <unistd.h>

#include <filesystem>
#include <fstream>
#include <memory>
#include <ostream>
#include <sstream>
#include <system_error>

namespace velt::cli {

namespace {

struct DocumentOptions {
    std::string file;
    bool dryRun = false;
};

/// Replaces a regular file, so that a full disk does not cost the former export; a link to it stays. Anything
/// else, such as a pipe, is written to.
Result<> writeExport(const std::string& name, const std::string& text) {
    std::error_code error;
    const std::filesystem::path former = std::filesystem::canonical(name, error);
    const auto status = std::filesystem::status(former, error);
    if (std::filesystem::is_regular_file(status) && ::access(former.c_str(), W_OK) == 0) {
        return replaceFile(former, text, static_cast<mode_t>(status.permissions()));
    }
    std::ofstream file(name, std::ios::binary | std::ios::trunc);
    file << text;
    file.close();
    return file ? Result<>() : cannot("write", name);
}

void exportTo(Context& context, const std::string& name) {
    const Json::Value document = exportSettings(context.api);
    if (name.empty()) {
        writeJson(context.console.out, document);
        return;
    }
    std::ostringstream text;
    writeJson(text, document);
    if (const auto written = writeExport(name, text.str()); !written) {
        throw Failure(ExitCode::local, written.error().message,
                      "Choose a file in a writable folder with free space.");
    }
}

Json::Value readDocument(Context& context, const std::string& name) {
    Json::Value document = readJsonFile(context.console, name);
    std::vector<std::string> faults = documentFaults(document);
    if (!faults.empty()) {
        faults.emplace_back("Nothing was changed.");
        throw Failure(ExitCode::refused, "Invalid settings in " + inputName(name) + ".",
                      "Correct it; 'veltctl export' writes a valid one.", faults);
    }
    return document;
}

void writeStep(Context& context, const ImportStep& step) {
    for (const std::string& change : step.changes) {
        context.console.out << step.section << "  " << change << '\n';
    }
    context.console.out.flush();
}

void writeResult(Context& context, const ImportPlan& plan, std::size_t applied, bool dryRun) {
    if (context.json) {
        Json::Value sections(Json::arrayValue);
        for (const ImportStep& step : plan.steps) {
            sections.append(jsonObject({{"section", step.section},
                                        {"changes", step.changesJson},
                                        {"applied", sections.size() < applied}}));
        }
        writeJson(context.console.out, jsonObject({{"dry_run", dryRun}, {"sections", sections}}));
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
        for (std::size_t i = 0; i < plan.steps.size(); ++i) {
            const char* const state = i < applied ? ": applied" : i == applied ? ": failed" : ": not applied";
            failure.note(plan.steps[i].section + state);
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
    save->add_option("-o,--output", options->file, "The file to write (default: standard output)")
        ->type_name("FILE");
    onWords(save, chosen, [options](Context& context) { exportTo(context, options->file); });

    CLI::App* load = app.add_subcommand("import", "Apply the settings of a document and show what changes");
    load->add_option("file", options->file, "The document, or - for standard input")
        ->required()
        ->type_name("");
    load->add_flag("-n,--dry-run", options->dryRun, "Only show what would change");
    onWords(load, chosen, [options](Context& context) { importFrom(context, *options); });
}

} // namespace velt::cli
