#include "base/json_value.h"
#include "base/printable.h"
#include "cli/change_report.h"
#include "cli/command.h"
#include "cli/failure.h"
#include "cli/json_io.h"
#include "cli/request_query.h"
#include "cli/size_text.h"
#include "cli/text_table.h"
#include "cli/time_text.h"

#include <CLI/CLI.hpp>

#include <chrono>
#include <ctime>
#include <memory>
#include <ostream>
#include <string>
#include <thread>

namespace velt::cli {

namespace {

constexpr const char* sessionsPath = "/api/sessions";

struct SessionOptions {
    std::string user;
    std::string address;
    std::string protocol;
    bool watch = false;
};

std::string sessionQuery(const SessionOptions& options) {
    RequestQuery query;
    query.add("user", options.user);
    query.add("address", options.address);
    query.add("protocol", options.protocol);
    return query.text();
}

std::string stateOf(const Json::Value& session) {
    const bool transfers = session["transfer"].isObject();
    std::string state = transfers ? textAt(session["transfer"], "direction") : "idle";
    if (!transfers && session["busy"] == true) {
        state = "busy";
    }
    return state + (session["current"] == false ? " (former settings)" : "");
}

/// The cells of the table, beginning with the id.
std::vector<std::string> cellsOf(const Json::Value& session) {
    const Json::Value& transfer = session["transfer"];
    const bool transfers = transfer.isObject();
    return {textAt(session, "id"),
            textAt(session, "user"),
            textAt(session, "protocol"),
            textAt(session, "address"),
            textAt(session, "since"),
            stateOf(session),
            transfers ? textAt(transfer, "path") : textAt(session, "path"),
            transfers ? sizeText(session["rate"].asUInt64()) + "/s" : ""};
}

void writeTable(std::ostream& out, const Json::Value& sessions) {
    Table table({"ID", "USER", "PROTOCOL", "ADDRESS", "SINCE", "STATE", "FILE", "RATE"});
    for (const Json::Value& session : sessions) {
        table.add(cellsOf(session));
    }
    table.write(out);
}

/// For what reads the output a line at a time: the time, and the cells between tabs.
void writeLines(std::ostream& out, const Json::Value& sessions) {
    const std::string now = utcText(std::time(nullptr));
    for (const Json::Value& session : sessions) {
        out << now;
        for (const std::string& cell : cellsOf(session)) {
            out << '\t' << printable(cell);
        }
        out << '\n';
    }
}

void writeRound(Context& context, const Json::Value& answer) {
    std::ostream& out = context.console.out;
    if (context.json) {
        out << compactJson(answer) << '\n';
    } else if (context.console.outputIsTerminal()) {
        const auto count = answer["sessions"].size();
        // To the first line, and away with what stood there.
        out << "\033[H\033[2J" << utcText(std::time(nullptr)) << "  " << count
            << (count == 1 ? " session" : " sessions") << "\n\n";
        writeTable(out, answer["sessions"]);
    } else {
        writeLines(out, answer["sessions"]);
    }
    out.flush();
}

/// Until the user interrupts or nobody takes the output any more.
void watchSessions(Context& context, const std::string& path) {
    const Console& console = context.console;
    console.watchInterruptions();
    while (!console.interrupted() && console.out.good()) {
        const auto begin = std::chrono::steady_clock::now();
        writeRound(context, context.api.get(path));
        while (!console.interrupted() && std::chrono::steady_clock::now() - begin < std::chrono::seconds(1)) {
            std::this_thread::sleep_for(std::chrono::milliseconds(50));
        }
    }
}

void showSessions(Context& context, const SessionOptions& options) {
    const std::string path = sessionsPath + sessionQuery(options);
    if (options.watch) {
        watchSessions(context, path);
        return;
    }
    const Json::Value answer = context.api.get(path);
    if (!context.wroteJson(answer)) {
        writeTable(context.console.out, answer["sessions"]);
    }
}

struct KickOptions {
    std::string session;
    std::string user;
    std::string address;
    std::string reason;
    bool dryRun = false;
};

std::string kickPath(const KickOptions& options) {
    RequestQuery query;
    query.add("user", options.user);
    query.add("address", options.address);
    query.add("reason", options.reason);
    query.add("dry_run", options.dryRun ? "true" : "");
    return sessionsPath + (options.session.empty() ? "" : "/" + percentEncode(options.session)) +
           query.text();
}

void kick(Context& context, const KickOptions& options) {
    if (options.session.empty() == (options.user.empty() && options.address.empty())) {
        throw Failure(ExitCode::usage, "Name one session, or --user or --address.",
                      "'veltctl sessions' lists them.");
    }
    Json::Value answer = context.api.remove(kickPath(options));
    if (options.dryRun) {
        writeReport(context, answer);
        return;
    }
    if (answer.isNull()) { // one session, which has ended
        answer = jsonObject({{"ended", 1}});
    }
    if (context.wroteJson(answer)) {
        return;
    }
    const auto count = answer["ended"].asUInt64();
    context.console.out << (count == 0 ? "There was no such session" : std::to_string(count))
                        << (count == 0   ? ".\n"
                            : count == 1 ? " session was ended.\n"
                                         : " sessions were ended.\n");
}

} // namespace

void addSessionCommands(CLI::App& app, Command& chosen) {
    auto shown = std::make_shared<SessionOptions>();
    CLI::App* sessions = app.add_subcommand("sessions", "Show who is logged in, and what they transfer");
    sessions->add_option("--user", shown->user, "Only sessions of this user")->type_name("NAME");
    sessions->add_option("--address", shown->address, "Only sessions from this address or network")
        ->type_name("ADDRESS");
    sessions->add_option("--protocol", shown->protocol, "Only sessions over ftp, ftps or sftp")
        ->check(CLI::IsMember({"ftp", "ftps", "sftp"}))
        ->type_name("PROTOCOL");
    sessions->add_flag("-w,--watch", shown->watch, "Show them again every second, until interrupted");
    onWords(sessions, chosen, [shown](Context& context) { showSessions(context, *shown); });

    auto ended = std::make_shared<KickOptions>();
    CLI::App* ending = app.add_subcommand("kick", "End a session, or those of a user or an address");
    ending->add_option("session", ended->session, "The id that 'sessions' shows")->type_name("");
    ending->add_option("--user", ended->user, "End all sessions of this user")->type_name("NAME");
    ending->add_option("--address", ended->address, "End all sessions from this address or network")
        ->type_name("ADDRESS");
    ending->add_option("--reason", ended->reason, "Why, for the administrator log")->type_name("TEXT");
    addDryRun(ending, ended->dryRun);
    onWords(ending, chosen, [ended](Context& context) { kick(context, *ended); });
}

} // namespace velt::cli
