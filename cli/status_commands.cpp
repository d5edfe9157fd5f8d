#include "cli/command.h"
#include "cli/failure.h"
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

// A service that is to run and does not is what an administrator looks for.
std::string stateOf(const Json::Value& service) {
    if (!service.isObject() || service["running"] != false) {
        return textAt(service, "enabled");
    }
    const bool shallRun = service["wanted"] == true || service["enabled"] == true;
    return shallRun ? "down" : textAt(service, "enabled");
}

/// Why services do not follow their settings; those of one daemon have one reason.
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

void showStatus(Context& context) {
    const Json::Value status = context.api.get("/api/status");
    if (context.json) {
        writeJson(context.console.out, status);
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
}

struct EventOptions {
    int count = 0;                  ///< 0: no end
    std::vector<std::string> kinds; ///< empty: all
};

std::string describeEvent(const std::string& event, const Json::Value& data) {
    if (event == "service") {
        return textAt(data, "service") + ": " + textAt(data, "action");
    }
    if (event == "log") {
        const std::string actor = textAt(data, "actor");
        return textAt(data, "event") + " " + textAt(data, "text") + (actor.empty() ? "" : " (" + actor + ")");
    }
    if (event == "request") {
        return textAt(data, "api") + " v" + textAt(data, "version") + " " + textAt(data, "method") + " by " +
               textAt(data, "actor") + " (" + textAt(data, "request_id") + ")";
    }
    return displayValue(data);
}

void writeEvent(Context& context, const std::string& event, const std::string& text) {
    std::string problem;
    const Json::Value data = parseJson(text, problem).value_or(Json::Value(text));
    if (context.json) {
        Json::Value line;
        line["event"] = event;
        line["data"] = data;
        context.console.out << compactJson(line) << '\n';
    } else {
        context.console.out << utcText(std::time(nullptr)) << "  " << printable(event) << "  "
                            << printable(describeEvent(event, data)) << '\n';
    }
    context.console.out.flush();
}

void followEvents(Context& context, const EventOptions& options) {
    int seen = 0;
    const auto enough = [&] { return options.count > 0 && seen >= options.count; };
    const auto wanted = [&](const std::string& event) {
        return options.kinds.empty() ||
               std::find(options.kinds.begin(), options.kinds.end(), event) != options.kinds.end();
    };
    EventStream stream([&](const std::string& event, const std::string& data) {
        if (!enough() && wanted(event)) {
            writeEvent(context, event, data);
            ++seen;
        }
    });
    context.console.watchInterruptions();
    context.api.follow(
        "/events",
        [&](std::string_view piece) {
            stream.feed(piece);
            return !enough() && context.console.out.good();
        },
        context.console.interrupted);
    if (!enough() && context.console.out.good() && !context.console.interrupted()) {
        throw Failure(ExitCode::access, "The server ended the stream of events.",
                      "Check with 'veltctl status' that it runs, then follow the events again.");
    }
}

} // namespace

void addStatusCommands(CLI::App& app, Command& chosen) {
    CLI::App* status = app.add_subcommand("status", "Show which services run, and on which ports");
    status->callback([&chosen] { chosen = showStatus; });

    auto options = std::make_shared<EventOptions>();
    CLI::App* events = app.add_subcommand("events", "Follow what happens on the server, until interrupted");
    events->add_option("--count", options->count, "End after so many events")
        ->check(CLI::PositiveNumber)
        ->type_name("N");
    events
        ->add_option("--kind", options->kinds,
                     "Only events of this kind, or these, separated by commas: service, log, request")
        ->check(CLI::IsMember({"service", "log", "request"}))
        ->delimiter(',')
        ->allow_extra_args(false)
        ->type_name("KIND");
    events->callback(
        [&chosen, options] { chosen = [options](Context& context) { followEvents(context, *options); }; });
}

} // namespace velt::cli
