#include "cli/key_import.h"

#include "base/json_value.h"
#include "base/printable.h"
#include "base/text.h"
#include "cli/change_report.h"
#include "cli/json_io.h"

#include <ostream>
#include <set>
#include <utility>

namespace velt::cli {

namespace {

/// The word of the line that is the key itself.
std::string_view base64In(std::string_view line) {
    while (!line.empty()) {
        const std::string_view word = cut(line, ' ');
        if (word.starts_with("AAAA")) {
            return word;
        }
    }
    return {};
}

class Import {
public:
    Import(Context& context, std::string user, bool dryRun)
        : context_(context), user_(std::move(user)), dryRun_(dryRun) {}

    /// What becomes of a line: "added", "present" or "refused".
    Json::Value outcomeOf(const KeyLine& line) {
        // A dry run adds none, so the server does not see that one comes twice.
        const bool again = dryRun_ && !added_.insert(std::string(base64In(line.text))).second;
        try {
            const Json::Value key = addKey(context_, user_, line.text, dryRunQuery(dryRun_));
            Json::Value told = outcome(line, again ? "present" : "added");
            for (const char* member : {"fingerprint", "comment"}) {
                if (key.isMember(member)) { // not in a dry run
                    told[member] = key[member];
                }
            }
            return told;
        } catch (const Failure& failure) {
            const bool present = failure.code() == ExitCode::conflict;
            if (!present && failure.code() != ExitCode::refused) {
                throw;
            }
            const std::string reason = failure.notes().empty() ? failure.what() : failure.notes().front();
            Json::Value told = outcome(line, present ? "present" : "refused");
            told["reason"] = reason;
            return told;
        }
    }

private:
    static Json::Value outcome(const KeyLine& line, const char* result) {
        return jsonObject({{"line", line.number}, {"result", result}});
    }

    Context& context_;
    std::string user_;
    bool dryRun_;
    std::set<std::string> added_; ///< in a dry run
};

void writeOutcome(std::ostream& out, const Json::Value& outcome) {
    out << "line " << outcome["line"].asInt() << ": " << textAt(outcome, "result");
    for (const char* key : {"fingerprint", "comment"}) {
        const std::string text = textAt(outcome, key);
        out << (text.empty() ? "" : " ") << printable(text);
    }
    const std::string reason = textAt(outcome, "reason");
    out << (reason.empty() ? "" : ": ") << printable(reason) << '\n';
}

Json::Value countsIn(const Json::Value& lines) {
    Json::Value counts = jsonObject({{"added", 0}, {"present", 0}, {"refused", 0}});
    for (const Json::Value& line : lines) {
        Json::Value& count = counts[line["result"].asString()];
        count = count.asInt() + 1;
    }
    return counts;
}

void writeEnd(Context& context, const Json::Value& lines, bool dryRun) {
    Json::Value counts = countsIn(lines);
    if (counts["refused"] > 0) {
        context.exitCode = ExitCode::refused;
    } else if (dryRun && counts["added"] > 0) {
        context.exitCode = ExitCode::wouldChange;
    }
    if (context.json) {
        counts["dry_run"] = dryRun;
        counts["lines"] = lines;
        writeJson(context.console.out, counts);
        return;
    }
    context.console.out << textAt(counts, "added") << " added, " << textAt(counts, "present")
                        << " already there, " << textAt(counts, "refused") << " refused.\n"
                        << (dryRun ? "Nothing was changed: this was a dry run.\n" : "");
}

} // namespace

std::vector<KeyLine> keyLinesIn(std::string_view text) {
    std::vector<KeyLine> lines;
    for (int number = 1; !text.empty(); ++number) {
        const std::string_view line = trimmed(cut(text, '\n'));
        if (!line.empty() && line.front() != '#') {
            lines.push_back({number, std::string(line)});
        }
    }
    return lines;
}

Json::Value addKey(Context& context, const std::string& user, const std::string& line,
                   const std::string& query) {
    return context.api.post("/api/keys" + query, jsonObject({{"user", user}, {"key", line}}));
}

void importKeys(Context& context, const std::string& user, const std::string& file, bool dryRun) {
    const auto keys = keyLinesIn(readInput(context.console, file));
    context.api.get("/api/keys?user=" + percentEncode(user)); // else each line would say that there is none
    Import import(context, user, dryRun);
    Json::Value lines(Json::arrayValue);
    for (const KeyLine& each : keys) {
        Json::Value outcome;
        try {
            outcome = import.outcomeOf(each);
        } catch (const Failure&) {
            writeEnd(context, lines, dryRun); // what was done before is done
            throw;
        }
        if (!context.json) {
            writeOutcome(context.console.out, outcome);
        }
        lines.append(std::move(outcome));
    }
    writeEnd(context, lines, dryRun);
}

} // namespace velt::cli
