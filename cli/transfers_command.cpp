#include "base/json_value.h"
#include "base/printable.h"
#include "cli/command.h"
#include "cli/failure.h"
#include "cli/json_io.h"
#include "cli/request_query.h"
#include "cli/size_text.h"
#include "cli/text_table.h"
#include "cli/time_text.h"

#include <CLI/CLI.hpp>

#include <ctime>
#include <memory>
#include <ostream>
#include <string>

namespace velt::cli {

namespace {

constexpr int defaultPage = 50;
constexpr int largestPage = 1000;
constexpr const char* transfersPath = "/api/transfers";

struct TransferOptions {
    std::string user;
    std::string session;
    std::string share;
    std::string path;
    std::string operations;
    std::string result;
    std::string from;
    std::string until;
    std::string before;
    int limit = 0; ///< 0: not given
    bool all = false;
    bool csv = false;
};

std::string momentOf(const std::string& text) {
    const auto moment = text.empty() ? text : parseSince(text, std::time(nullptr));
    if (!moment) {
        throw Failure(ExitCode::usage, "Invalid time \"" + text + "\".",
                      "Use a time such as 2026-11-21T08:00:00Z, or an age such as 30m, 2h or 7d.");
    }
    return *moment;
}

std::string pathOfPage(const TransferOptions& options) {
    const int usual = options.all ? largestPage : defaultPage;
    RequestQuery query;
    query.add("limit", std::to_string(options.limit > 0 ? options.limit : usual));
    query.add("user", options.user);
    query.add("session", options.session);
    query.add("share", options.share);
    query.add("path", options.path);
    query.add("operation", options.operations);
    query.add("result", options.result);
    query.add("from", momentOf(options.from));
    query.add("until", momentOf(options.until));
    query.add("before", options.before);
    query.add("format", options.csv ? "csv" : "");
    return transfersPath + query.text();
}

std::string resultOf(const Json::Value& record) {
    const std::string reason = textAt(record, "reason");
    const std::string more = record["left_out"].isIntegral() ? displayValue(record["left_out"]) : "";
    return textAt(record, "result") + (reason.empty() ? "" : ": " + reason) +
           (more.empty() ? "" : " (after " + more + " refused ones without a record)");
}

std::string placesOf(const Json::Value& record) {
    const std::string next = textAt(record, "new_path");
    const std::string target = textAt(record, "operation") == "link" ? textAt(record, "detail") : "";
    return textAt(record, "path") + (record["cut"].isBool() ? "..." : "") +
           (next.empty() ? "" : " -> " + next) + (target.empty() ? "" : " (symbolic link to " + target + ")");
}

void writeTable(std::ostream& out, const Json::Value& records) {
    const auto size = [](const Json::Value& octets, const char* suffix) {
        return octets.isIntegral() ? sizeText(octets.asUInt64()) + suffix : "";
    };
    Table table({"TIME", "USER", "PROTOCOL", "ADDRESS", "OPERATION", "RESULT", "SIZE", "RATE", "PATH"});
    for (const Json::Value& record : records) {
        table.add({textAt(record, "time"), textAt(record, "user"), textAt(record, "protocol"),
                   textAt(record, "address"), textAt(record, "operation"), resultOf(record),
                   size(record["octets"], ""), size(record["rate"], "/s"), placesOf(record)});
    }
    table.write(out);
}

void noteNext(Context& context, const std::string& next) {
    context.console.err << "For older ones: veltctl transfers --before " << printable(next)
                        << " (with the same filters), or --all\n";
}

void showRecords(Context& context, TransferOptions options) {
    Json::Value records(Json::arrayValue);
    Json::Value next;
    do {
        const Json::Value page = context.api.get(pathOfPage(options));
        for (const Json::Value& record : page["records"]) {
            records.append(record);
        }
        // A server that names the same page again must not be asked forever.
        next = displayValue(page["next"]) == options.before ? Json::Value() : page["next"];
        options.before = displayValue(next);
    } while (options.all && !next.isNull());
    if (context.wroteJson(jsonObject({{"records", records}, {"next", next}}))) {
        return;
    }
    writeTable(context.console.out, records);
    if (!next.isNull()) {
        noteNext(context, displayValue(next));
    }
}

/// The value of "before" in the path of a page; "" without one.
std::string keyIn(const std::string& path) {
    const std::string name = "before=";
    const auto begin = path.find(name);
    return begin == std::string::npos
               ? ""
               : path.substr(begin + name.size(), path.find('&', begin) - begin - name.size());
}

/// Page by page, so that all of a large store need not be held at once. Only the first has its titles.
void writeCsv(Context& context, TransferOptions options) {
    std::ostream& out = context.console.out;
    for (bool isFirst = true; out.good(); isFirst = false) {
        const TextPage page = context.api.getText(pathOfPage(options));
        const auto titles = page.text.find('\n');
        out << (isFirst || titles == std::string::npos ? page.text : page.text.substr(titles + 1));
        const std::string next = keyIn(page.next);
        if (next.empty() || next == options.before) {
            return;
        }
        if (!options.all) {
            noteNext(context, next);
            return;
        }
        options.before = next;
    }
}

void addFilters(CLI::App* command, TransferOptions& options) {
    const auto add = [command](const char* name, std::string& value, const char* help, const char* type) {
        return command->add_option(name, value, help)->type_name(type);
    };
    add("--user", options.user, "Only operations of this user", "NAME");
    add("--session", options.session, "Only operations of the session with this id", "ID");
    add("--share", options.share, "Only operations in this share", "NAME");
    add("--path", options.path,
        "Only what begins with this: the path on the server, or with --share within the share", "PATH");
    add("--operation", options.operations,
        "Only these, separated by commas: upload, download, delete, rename, make-folder, remove-folder, "
        "mode, "
        "owner, times, link, truncate, session-opened, session-closed, login-refused",
        "NAME");
    add("--result", options.result, "Only those that are done, incomplete or refused", "RESULT")
        ->check(CLI::IsMember({"done", "incomplete", "refused"}));
    add("--from", options.from, "Only since a time, or no older than 30m, 2h or 7d", "TIME");
    add("--until", options.until, "Only before a time, or older than 30m, 2h or 7d", "TIME");
    add("--before", options.before, "Only older ones than this page: what the page before named", "KEY");
}

} // namespace

void addTransfersCommand(CLI::App& app, Command& chosen) {
    auto options = std::make_shared<TransferOptions>();
    CLI::App* transfers =
        app.add_subcommand("transfers", "Show what users transferred, deleted, renamed, ..., newest first");
    addFilters(transfers, *options);
    transfers->add_option("--limit", options->limit, "Operations per page, 1 to 1000 (default 50)")
        ->check(CLI::Range(1, largestPage))
        ->type_name("N");
    transfers->add_flag("--all", options->all, "Show all pages");
    transfers->add_flag("--csv", options->csv, "Write CSV, for spreadsheets");
    onWords(transfers, chosen, [options](Context& context) {
        if (options->csv && context.json) {
            throw Failure(ExitCode::usage, "--csv excludes --json.", "Use one of them.");
        }
        options->csv ? writeCsv(context, *options) : showRecords(context, *options);
    });
}

} // namespace velt::cli
