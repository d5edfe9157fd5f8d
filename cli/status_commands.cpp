#include "base/json_value.h"
#include "base/printable.h"
#include "cli/command.h"
#include "cli/event_text.h"
#include "cli/failure.h"
#include "cli/health_count.h"
#include "cli/json_io.h"
#include "cli/server_events.h"
#include "cli/text_table.h"
#include "cli/time_text.h"

#include <CLI/CLI.hpp>

#include <algorithm>
#include <ctime>
#include <memory>
#include <ostream>

namespace velt::cli {

namespace {

// What an administrator looks for is a service that should run and does not.
std::string stateOf(const Json::Value& service) {
    if (!service.isObject() || service["running"] != false) {
        return textAt(service, "enabled");
    }
    const bool shouldRun = service["wanted"] == true || service["enabled"] == true;
    return shouldRun ? "down" : textAt(service, "enabled");
}

/// Why services are not in the state that their settings ask for. Services of one daemon share a reason.
void writeReasons(Context& context, const Json::Value& services) {
    std::string last;
    for (const Json::Value& service : services) {
        const bool given = service.isObject() && service["reason"].isString();
        const std::string reason = given ? service["reason"].asString() : "";
        if (!reason.empty() && reason != last) {
            context.console.out << '\n'
                                << printable(textAt(service, "name")) << ": " << printable(reason) << '\n';
        }
        last = reason;
    }
}

std::string counted(int count, const std::string& word) {
    return std::to_string(count) + " " + word + (count == 1 ? "" : "s");
}

/// A server that cannot tell of its health has a status nevertheless.
void writeHealth(Context& context) {
    HealthCount count;
    try {
        count = countFindings(context.api.get("/api/health"));
    } catch (const Failure&) {
        return;
    }
    if (count.grave() > 0) {
        const std::string errors = count.errors > 0 ? counted(count.errors, "error") : "";
        const std::string warnings = count.warnings > 0 ? counted(count.warnings, "warning") : "";
        context.console.out << '\n'
                            << errors << (count.errors > 0 && count.warnings > 0 ? " and " : "") << warnings
                            << ": see 'veltctl doctor'.\n";
    }
}

void showStatus(Context& context) {
    const Json::Value status = context.api.get("/api/status");
    if (context.wroteJson(status)) {
        return;
    }
    context.console.out << "veltd " << printable(textAt(status, "version")) << ", up for "
                        << durationText(status["uptime_seconds"].asInt64()) << "\n\n";
    Table table({"SERVICE", "STATE", "PORT"});
    for (const Json::Value& service : status["services"]) {
        table.add({textAt(service, "name"), stateOf(service), textAt(service, "port")});
    }
    table.write(context.console.out);
    writeReasons(context, status["services"]);
    writeHealth(context);
}

struct EventOptions {
    int count = 0;                  ///< 0: no end
    std::vector<std::string> kinds; ///< empty: the usual ones
};

void writeEvent(Context& context, const std::string& event, const std::string& text) {
    const Json::Value data = parseJson(text).valueOr(text);
    if (context.json) {
        context.console.out << compactJson(jsonObject({{"event", event}, {"data", data}})) << '\n';
    } else {
        context.console.out << utcText(std::time(nullptr)) << "  " << printable(event) << "  "
                            << printable(describeEvent(event, data)) << '\n';
    }
    context.console.out.flush();
}

void showEvents(Context& context, const EventOptions& options) {
    int seen = 0;
    followEvents(
        context, options.kinds, [] {},
        [&](const std::string& event, const std::string& data) {
            const auto& kinds = options.kinds;
            if (kinds.empty() || std::ranges::find(kinds, event) != kinds.end()) {
                writeEvent(context, event, data);
                ++seen;
            }
            return options.count == 0 || seen < options.count;
        });
}

} // namespace

void addStatusCommands(CLI::App& app, Command& chosen) {
    CLI::App* status = app.add_subcommand("status", "Show which services run, and on which ports");
    onWords(status, chosen, showStatus);

    auto options = std::make_shared<EventOptions>();
    CLI::App* events =
        app.add_subcommand("events", "Show what happens on the server as it happens, until interrupted");
    events->add_option("--count", options->count, "Stop after this many events")
        ->check(CLI::Range(1, 1000000))
        ->type_name("N");
    events
        ->add_option("--kind", options->kinds,
                     "Only events of these kinds, separated by commas: service, log, ban, change (these four "
                     "unless given), session, transfer, operation")
        ->check(CLI::IsMember({"service", "log", "ban", "change", "session", "transfer", "operation"}))
        ->delimiter(',')
        ->allow_extra_args(false)
        ->type_name("KIND");
    onWords(events, chosen, [options](Context& context) { showEvents(context, *options); });
}

} // namespace velt::cli
