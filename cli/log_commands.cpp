#include "base/json_value.h"
#include "base/printable.h"
#include "cli/command.h"
#include "cli/failure.h"
#include "cli/json_io.h"
#include "cli/server_events.h"
#include "cli/text_table.h"
#include "cli/time_text.h"

#include <CLI/CLI.hpp>

#include <ctime>
#include <memory>
#include <ostream>

namespace velt::cli {

namespace {

constexpr int defaultPage = 50;
constexpr int largestPage = 1000;

struct LogOptions {
    std::string since;
    std::string event;
    std::string actor;
    std::string before;
    int limit = defaultPage;
    bool all = false;
    bool follow = false;
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
            throw Failure(ExitCode::usage, "Invalid time \"" + options.since + "\".",
                          "Use a time such as 2026-11-21T08:00:00Z, or an age such as 30m, 2h or 7d.");
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

void writeLog(Context& context, const Json::Value& entries, const Json::Value& next) {
    if (context.wroteJson(jsonObject({{"entries", entries}, {"next", next}}))) {
        return;
    }
    Table table({"ID", "TIME", "EVENT", "ACTOR", "ADDRESS", "TEXT"});
    for (const Json::Value& entry : entries) {
        table.add({textAt(entry, "id"), timeOf(entry), textAt(entry, "event"), textAt(entry, "actor"),
                   textAt(entry, "address"), textAt(entry, "text")});
    }
    table.write(context.console.out);
    if (!next.isNull()) {
        context.console.err << "For older entries: veltctl log --before " << printable(displayValue(next))
                            << " (with the same filters), or --all\n";
    }
}

void showLog(Context& context, LogOptions options) {
    Json::Value entries(Json::arrayValue);
    Json::Value next;
    do {
        const Json::Value page = context.api.get(logPath(options));
        for (const Json::Value& entry : page["entries"]) {
            entries.append(entry);
        }
        // A server that names the same page again must not be asked forever.
        next = displayValue(page["next"]) == options.before ? Json::Value() : page["next"];
        options.before = displayValue(next);
    } while (options.all && !next.isNull());
    writeLog(context, entries, next);
}

// An event's number as the server writes it: hexadecimal or decimal, in any case.
unsigned long eventNumber(const std::string& text) {
    return std::strtoul(text.c_str(), nullptr, 0);
}

// The entries as they come, one per line.
class FollowedLog {
public:
    FollowedLog(Context& context, const LogOptions& options) : context_(context), options_(options) {}

    // The newest entries so far, oldest first.
    void begin() {
        // The other connection is busy with the events.
        ApiClient api(context_.api.server());
        const Json::Value page = api.get(logPath(options_));
        for (Json::ArrayIndex i = page["entries"].size(); i > 0; --i) {
            write(page["entries"][i - 1]);
        }
    }

    void take(const std::string& event, const std::string& data) {
        const Json::Value entry = parseJson(data).valueOr({});
        if (event == "log" && entry.isObject() && matches(entry)) {
            write(entry);
        }
    }

private:
    bool matches(const Json::Value& entry) const {
        return (options_.actor.empty() || textAt(entry, "actor") == options_.actor) &&
               (options_.event.empty() || eventNumber(textAt(entry, "event")) == eventNumber(options_.event));
    }

    void write(const Json::Value& entry) {
        // An entry may be on the page and among the events as well.
        if (entry["id"].asInt64() <= last_) {
            return;
        }
        last_ = entry["id"].asInt64();
        std::ostream& out = context_.console.out;
        if (context_.json) {
            out << compactJson(entry) << '\n';
        } else {
            const char* gap = "  ";
            out << printable(timeOf(entry)) << gap << printable(textAt(entry, "event")) << gap
                << printable(textAt(entry, "actor")) << gap << printable(textAt(entry, "address")) << gap
                << printable(textAt(entry, "text")) << '\n';
        }
        out.flush();
    }

    Context& context_;
    const LogOptions& options_;
    std::int64_t last_ = 0;
};

void followLog(Context& context, const LogOptions& options) {
    FollowedLog log(context, options);
    // The page is asked for only once the events come, so that it has what was written before them.
    followEvents(
        context, {"log"}, [&log] { log.begin(); },
        [&log](const std::string& event, const std::string& data) {
            log.take(event, data);
            return true;
        });
}

} // namespace

void addLogCommand(CLI::App& app, Command& chosen) {
    auto options = std::make_shared<LogOptions>();
    CLI::App* log = app.add_subcommand("log", "Show the administrator log, the newest entries first");
    log->add_option("--since", options->since, "Only entries since a time, or no older than 30m, 2h or 7d")
        ->type_name("TIME");
    log->add_option("--event", options->event, "Only entries of this event, such as 0x11B00012")
        ->type_name("EVENT");
    log->add_option("--actor", options->actor, "Only entries of this user or token")->type_name("NAME");
    CLI::Option* before =
        log->add_option("--before", options->before, "Only entries older than the one with this id")
            ->type_name("ID");
    log->add_option("--limit", options->limit, "Entries per page, 1 to 1000 (default 50)")
        ->check(CLI::Range(1, largestPage))
        ->type_name("N");
    CLI::Option* all = log->add_flag("--all", options->all, "Show all pages");
    log->add_flag("-f,--follow", options->follow,
                  "Show the newest entries last, then new ones as they come, until interrupted")
        ->excludes(before)
        ->excludes(all);
    onWords(log, chosen, [options](Context& context) {
        options->follow ? followLog(context, *options) : showLog(context, *options);
    });
}

} // namespace velt::cli
