#include "base/file.h"
#include "cli/change_report.h"
#include "cli/command.h"
#include "cli/failure.h"
#include "cli/json_io.h"

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
    ChangeOptions change;
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
    const Json::Value document = context.api.get(settingsPath);
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

void importFrom(Context& context, const DocumentOptions& options) {
    changeSettings(context, readJsonFile(context.console, options.file), options.change);
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
    addChangeOptions(load, options->change);
    onWords(load, chosen, [options](Context& context) { importFrom(context, *options); });
}

} // namespace velt::cli
