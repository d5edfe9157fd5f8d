#include "cli/change_report.h"

#include "base/printable.h"
#include "cli/failure.h"
#include "cli/json_io.h"

#include <CLI/CLI.hpp>

#include <algorithm>
#include <iterator>
#include <ostream>
#include <vector>

namespace velt::cli {

namespace {

constexpr int longestConfirmation = 86400;

std::string shown(const Json::Value& value) {
    const std::string text = displayValue(value);
    return text.empty() ? "(empty)" : printable(text);
}

std::string ruleText(const Json::Value& rule) {
    return printable(textAt(rule, "type") + " " + textAt(rule, "name") + " " + textAt(rule, "path"));
}

bool holds(const Json::Value& list, const Json::Value& wanted) {
    return std::ranges::any_of(list, [&](const Json::Value& each) { return each == wanted; });
}

/// "user anna", whom a rule is for.
std::string ownerOf(const Json::Value& rule) {
    return printable(textAt(rule, "type") + " " + textAt(rule, "name"));
}

/// The rules of the one list that the other does not hold.
std::vector<Json::Value> missingFrom(const Json::Value& others, const Json::Value& rules) {
    std::vector<Json::Value> missing;
    std::ranges::copy_if(rules, std::back_inserter(missing),
                         [&](const Json::Value& rule) { return !holds(others, rule); });
    return missing;
}

/// A line for each rule that comes, goes, or replaces one of the same user or group.
void writeRuleChanges(std::ostream& out, const std::string& name, const Json::Value& change) {
    const std::vector<Json::Value> gone = missingFrom(change["to"], change["from"]);
    std::vector<Json::Value> come = missingFrom(change["from"], change["to"]);
    if (gone.empty() && come.empty()) {
        out << name << ": the same rules in another order\n";
    }
    for (const Json::Value& rule : gone) {
        const auto next = std::ranges::find(come, ownerOf(rule), ownerOf);
        if (next == come.end()) {
            out << name << ": remove " << ruleText(rule) << '\n';
        } else {
            out << name << ": " << ruleText(rule) << " -> " << printable(textAt(*next, "path")) << '\n';
            come.erase(next);
        }
    }
    for (const Json::Value& rule : come) {
        out << name << ": add " << ruleText(rule) << '\n';
    }
}

std::string nameOf(const Json::Value& change, const std::string& section) {
    const std::string field = textAt(change, "field");
    const std::string prefix = "/" + section + "/";
    return field.starts_with(prefix) ? field.substr(prefix.size())
                                     : field.substr(field.starts_with('/') ? 1 : 0);
}

/// "stores the ftp settings" for {"effect": "store", "subject": "ftp settings"}.
std::string sentenceOf(const Json::Value& effect) {
    struct Verb {
        const char* effect;
        const char* before;
        const char* after;
    };
    static constexpr Verb verbs[] = {
        {"store", "stores the ", ""},
        {"start", "starts ", ""},
        {"hand over", "hands the port of ", " over to a new daemon"},
        {"pause", "pauses ", ""},
        {"stop", "stops ", " and ends its sessions"},
        {"close", "switches ", " off and lets its sessions go on"},
        {"end sessions", "ends the sessions of ", ""},
        {"open port", "opens port ", ""},
        {"close port", "closes port ", ""},
        {"event", "tells of the event ", ""},
        {"log", "writes into the log: ", ""},
    };
    const std::string name = textAt(effect, "effect");
    const std::string subject = printable(textAt(effect, "subject"));
    for (const Verb& verb : verbs) {
        if (name == verb.effect) {
            return verb.before + subject + verb.after;
        }
    }
    return printable(name) + " " + subject;
}

void writePlan(std::ostream& out, const Json::Value& report) {
    for (const Json::Value& effect : report["effects"]) {
        out << "  " << sentenceOf(effect) << '\n';
    }
}

void writeNotes(Context& context, const Json::Value& report) {
    for (const Json::Value& warning : report["warnings"]) {
        context.console.err << "veltctl: warning: " << printable(warning.asString()) << '\n';
    }
    for (const Json::Value& down : report["down"]) {
        context.console.err << "veltctl: warning: the " << printable(textAt(down, "service"))
                            << " service does not run: " << printable(textAt(down, "reason")) << '\n';
    }
}

} // namespace

std::string ChangeOptions::query() const {
    std::string text;
    const auto add = [&text](const std::string& parameter) {
        text += (text.empty() ? "?" : "&") + parameter;
    };
    if (dryRun) {
        add("dry_run=true");
    }
    if (keepSessions || endSessions) {
        add(std::string("sessions=") + (keepSessions ? "keep" : "end"));
    }
    if (confirmWithin > 0) {
        add("confirm_within=" + std::to_string(confirmWithin));
    }
    return text;
}

void addDryRun(CLI::App* command, bool& dryRun) {
    command->add_flag("-n,--dry-run", dryRun, "Only show what would be done");
}

std::string dryRunQuery(bool dryRun) {
    return dryRun ? "?dry_run=true" : "";
}

void addChangeOptions(CLI::App* command, ChangeOptions& options) {
    addDryRun(command, options.dryRun);
    CLI::Option* const keep =
        command->add_flag("--keep-sessions", options.keepSessions,
                          "End no open session; a service that is switched off accepts no new ones");
    command
        ->add_flag("--end-sessions", options.endSessions,
                   "End all open sessions of the services that the change concerns")
        ->excludes(keep);
    command
        ->add_option("--confirm-within", options.confirmWithin,
                     "Take the change back unless 'veltctl confirm' comes within so many seconds")
        ->check(CLI::Range(1, longestConfirmation))
        ->type_name("SECONDS");
}

void changeSettings(Context& context, const Json::Value& patch, const ChangeOptions& options,
                    const std::string& section) {
    writeReport(context, context.api.patch(settingsPath + options.query(), patch), section);
}

void writeChanges(std::ostream& out, const Json::Value& changes, const std::string& section) {
    for (const Json::Value& change : changes) {
        const std::string name = printable(nameOf(change, section));
        if (change["to"].isArray()) {
            writeRuleChanges(out, name, change);
        } else {
            out << name << ": " << shown(change["from"]) << " -> " << shown(change["to"]) << '\n';
        }
    }
}

void writeReport(Context& context, const Json::Value& report, const std::string& section) {
    const bool dryRun = report["dry_run"] == true;
    const bool changes = !report["changes"].empty() || !report["effects"].empty();
    if (dryRun && changes) {
        context.exitCode = ExitCode::wouldChange;
    }
    if (context.wroteJson(report)) {
        return;
    }
    std::ostream& out = context.console.out;
    writeChanges(out, report["changes"], section);
    if (dryRun) {
        writePlan(out, report);
        out << (changes ? "Nothing was changed: this was a dry run.\n" : "Nothing to change.\n");
    } else if (!changes) {
        out << "Nothing changed.\n";
    }
    if (const int ended = report["sessions_ended"].asInt(); ended > 0) {
        out << ended << (ended == 1 ? " session " : " sessions ")
            << (dryRun ? "would be ended.\n" : "ended.\n");
    }
    if (const std::string deadline = textAt(report, "confirm_by"); !deadline.empty()) {
        out << "The change is taken back at " << printable(deadline)
            << " unless you confirm it: veltctl confirm " << textAt(report, "id") << '\n';
    }
    writeNotes(context, report);
}

} // namespace velt::cli
