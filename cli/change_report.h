// What the server says of a change of the settings, for people.
#ifndef VELT_CLI_CHANGE_REPORT_H
#define VELT_CLI_CHANGE_REPORT_H

#include "cli/command.h"

#include <json/value.h>

#include <iosfwd>
#include <string>

namespace velt::cli {

/// How a change is to be made: options that several commands have.
struct ChangeOptions {
    bool dryRun = false;
    bool keepSessions = false;
    bool endSessions = false;
    int confirmWithin = 0; ///< seconds; 0: no confirmation

    /// "?dry_run=true&sessions=keep"; "" without any.
    std::string query() const;
};

/// Adds --dry-run, --keep-sessions, --end-sessions and --confirm-within, which fill the options; they outlive
/// the parser.
void addChangeOptions(CLI::App* command, ChangeOptions& options);

/// Adds --dry-run alone, to a command that changes something else than settings. It outlives the parser.
void addDryRun(CLI::App* command, bool& dryRun);

/// "?dry_run=true"; "" without.
std::string dryRunQuery(bool dryRun);

/// The path of all settings.
inline constexpr const char* settingsPath = "/api/settings";

/// Changes the settings that the patch (RFC 7396) names, and writes what that did. `section` is left out of
/// the names of settings: "timeout" for "/ftp/timeout".
void changeSettings(Context& context, const Json::Value& patch, const ChangeOptions& options,
                    const std::string& section = "");

/// Writes a line for each field that is another one, and for each rule. `section` as above.
void writeChanges(std::ostream& out, const Json::Value& changes, const std::string& section = "");

/// Writes the server's answer to a change. After a dry run of something that would change, the command's exit
/// code says so.
void writeReport(Context& context, const Json::Value& report, const std::string& section = "");

} // namespace velt::cli

#endif
