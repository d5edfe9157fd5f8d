#include "cli/event_stream.h"
#include "cli/failure.h"
#include "cli/json_text.h"
#include "cli/session.h"
#include "cli/table.h"
#include "cli/time_text.h"

#include <CLI/CLI.hpp>

#include <ctime>
#include <memory>
#include <ostream>

namespace velt::cli {

namespace {

constexpr int defaultPage = 50;

void showStatus(Session& session) {
    const Json::Value status = session.api.get("/api/status");
    if (session.json) {
        writeJson(session.console.out, status);
        return;
    }
    session.console.out << "veltd " << printable(textAt(status, "version")) << ", up for "
                        << durationText(status["uptime_seconds"].asInt64()) << "\n\n";
    Table table({"SERVICE", "STATE", "PORT"});
    for (const Json::Value& service : status["services"]) {
        table.add({textAt(service, "name"), textAt(service, "enabled"), textAt(service, "port")});
    }
    table.write(session.console.out);
}

struct LogOptions {
    std::string since;
    std::string event;
    std::string actor;
    std::string before;
    int limit = defaultPage;
    bool all = false;
};

std::string logPath(const LogOptions& options) {
    std::string path = "/api/log?limit=" + std::to_string(options.limit);
    const auto add = [&path](const char* name, const std::string& value) {
        if (!value.empty()) {
            path += std::string("&") + name + "=" + percentEncode(value);
        }
    };
    if (!options.since.empty()) {
        const std::optional<std::string> since = parseSince(options.since, std::time(nullptr));
        if (!since) {
            throw Failure(ExitCode::usage, "\"" + options.since + "\" is no point in time.",
                          "Give a time such as 2026-11-21T08:00:00Z, or an age such as 30m, 2h or 7d.");
        }
        add("since", *since);
    }
    add("event", options.event);
    add("actor", options.actor);
    add("before", options.before);
    return path;
}

std::string timeOf(const Json::Value& entry) {
    const Json::Value& time = entry["time"];
    return time.isIntegral() ? utcText(static_cast<std::time_t>(time.asInt64())) : displayValue(time);
}

void writeLog(Session& session, const Json::Value& entries, const Json::Value& next) {
    if (session.json) {
        Json::Value result;
        result["entries"] = entries;
        result["next"] = next;
        writeJson(session.console.out, result);
        return;
    }
    Table table({"ID", "TIME", "EVENT", "ACTOR", "ADDRESS", "TEXT"});
    for (const Json::Value& entry : entries) {
        table.add({textAt(entry, "id"), timeOf(entry), textAt(entry, "event"), textAt(entry, "actor"),
                   textAt(entry, "address"), textAt(entry, "text")});
    }
    table.write(session.console.out);
    if (!next.isNull()) {
        session.console.err << "Older entries: veltctl log --before " << printable(displayValue(next))
                            << " (with the same filters), or --all\n";
    }
}

void showLog(Session& session, LogOptions options) {
    Json::Value entries(Json::arrayValue);
    Json::Value next;
    do {
        const Json::Value page = session.api.get(logPath(options));
        for (const Json::Value& entry : page["entries"]) {
            entries.append(entry);
        }
        // A server that names the same page again would be asked for ever.
        next = displayValue(page["next"]) == options.before ? Json::Value() : page["next"];
        options.before = displayValue(next);
    } while (options.all && !next.isNull());
    writeLog(session, entries, next);
}

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

void writeEvent(Session& session, const std::string& event, const std::string& text) {
    std::string problem;
    const Json::Value data = parseJson(text, problem).value_or(Json::Value(text));
    if (session.json) {
        Json::Value line;
        line["event"] = event;
        line["data"] = data;
        session.console.out << compactJson(line) << '\n';
    } else {
        session.console.out << utcText(std::time(nullptr)) << "  " << printable(event) << "  "
                            << printable(describeEvent(event, data)) << '\n';
    }
    session.console.out.flush();
}

void followEvents(Session& session, int count) {
    int seen = 0;
    const auto enough = [&] { return count > 0 && seen >= count; };
    EventStream stream([&](const std::string& event, const std::string& data) {
        if (!enough()) {
            writeEvent(session, event, data);
            ++seen;
        }
    });
    session.console.watchInterruptions();
    session.api.follow(
        "/events",
        [&](std::string_view piece) {
            stream.feed(piece);
            return !enough() && session.console.out.good();
        },
        session.console.interrupted);
    if (!enough() && session.console.out.good() && !session.console.interrupted()) {
        throw Failure(ExitCode::access, "The server ended the stream of events.",
                      "Check with 'veltctl status' that it runs, then follow the events again.");
    }
}

void addLog(CLI::App& app, Command& chosen) {
    auto options = std::make_shared<LogOptions>();
    CLI::App* log = app.add_subcommand("log", "Show the administrator log, the newest entries first");
    log->add_option("--since", options->since, "Entries since a time, or not older than 30m, 2h, 7d")
        ->type_name("TIME");
    log->add_option("--event", options->event, "Entries of one event, such as 0x11B00012")
        ->type_name("EVENT");
    log->add_option("--actor", options->actor, "Entries of one actor")->type_name("NAME");
    log->add_option("--before", options->before, "Entries older than the one with this id")->type_name("ID");
    log->add_option("--limit", options->limit, "Entries per page (default 50)")
        ->check(CLI::PositiveNumber)
        ->type_name("N");
    log->add_flag("--all", options->all, "All pages, not only one");
    log->callback(
        [&chosen, options] { chosen = [options](Session& session) { showLog(session, *options); }; });
}

} // namespace

void addStatusCommands(CLI::App& app, Command& chosen) {
    CLI::App* status = app.add_subcommand("status", "Show which services run, and on which ports");
    status->callback([&chosen] { chosen = showStatus; });

    addLog(app, chosen);

    auto count = std::make_shared<int>(0);
    CLI::App* events = app.add_subcommand("events", "Follow what happens on the server, until interrupted");
    events->add_option("--count", *count, "End after so many events")
        ->check(CLI::PositiveNumber)
        ->type_name("N");
    events->callback(
        [&chosen, count] { chosen = [count](Session& session) { followEvents(session, *count); }; });
}

} // namespace velt::cli
