#include "cli/server_refusal.h"

#include "cli/json_io.h"

#include <algorithm>
#include <iterator>

namespace velt::cli {

namespace {

constexpr int codeShareUnreachable = 1905;
constexpr const char* historyPath = "/api/history/";

struct Meaning {
    long status;
    ExitCode code;
    const char* message;
};

constexpr Meaning meanings[] = {
    {401, ExitCode::access, "The server requires authentication"},
    {403, ExitCode::access, "The server does not allow this"},
    {404, ExitCode::refused, "The server cannot find this"},
    {405, ExitCode::refused, "The server does not support this method"},
    {408, ExitCode::access, "The server is busy"},
    {409, ExitCode::conflict, "The request conflicts with something else on the server"},
    {412, ExitCode::conflict, "The settings have changed since they were read"},
    {429, ExitCode::access, "The server is busy"},
};
constexpr Meaning otherFailure{500, ExitCode::platform, "The server failed to carry out the request"};
constexpr Meaning otherRefusal{400, ExitCode::refused, "The server refused the input"};
constexpr Meaning notFromVeltd{0, ExitCode::access, "The answer is not from veltd"};

const Meaning& meaningOf(long status) {
    const auto* const found = std::ranges::find(meanings, status, &Meaning::status);
    if (found != std::end(meanings)) {
        return *found;
    }
    return status >= 500 ? otherFailure : status >= 400 ? otherRefusal : notFromVeltd;
}

std::string accessHint(long status, const ServerAddress& server) {
    if (!server.socket.empty()) {
        return "Run veltctl as root or as a member of the group velt-admin.";
    }
    if (status == 403) {
        return "Use a token with the role admin; this one can only read.";
    }
    const std::string create = " To make one, run 'veltctl tokens create' as root on the server.";
    return (server.token.empty() ? "Pass a token in VELT_TOKEN or with --token-file."
                                 : "The token is not valid. Use another one.") +
           create;
}

/// Of a change in the history that is not as the request takes it to be; "" for another conflict, such as a
/// port that an undoing would need.
std::string historyHint(const Json::Value& problem, const std::string& path) {
    const bool ofSettings = problem.isMember("code") || problem.isMember("holder");
    if (!path.starts_with(historyPath) || ofSettings) {
        return "";
    }
    if (!problem["errors"].empty()) {
        return "'veltctl history' lists the later change: undo that one first, or set by hand what you want.";
    }
    return problem.isMember("changed") ? "" : "'veltctl history' tells the state of each change.";
}

constexpr const char* mendOnServer =
    "Mend what the server names, then try again. 'veltctl doctor' may know the command.";

std::string conflictHint(const Json::Value& problem, const std::string& path) {
    if (std::string hint = historyHint(problem, path); !hint.empty()) {
        return hint;
    }
    if (problem["code"] == codeShareUnreachable) {
        return "Choose another share ('veltctl shares' lists them), let the account ftp read this one, or "
               "switch anonymous_chroot off.";
    }
    const bool isPort =
        problem.isMember("holder") || textAt(problem, "title").find(" is taken") != std::string::npos;
    return isPort ? "Choose another port, or free this one." : mendOnServer;
}

// A refusal of the module says whether anything was changed, unless its method only reads.
std::string failureHint(const Json::Value& problem, const AskedFor& asked) {
    if (asked.path.starts_with("/api/restart")) { // settings stay as they are
        return "Fix the problem that the server names, then try again; 'veltctl status' shows what runs.";
    }
    const bool reads = asked.method == "GET" || asked.path == "/api/diff";
    const bool changed =
        problem["changed"].isBool() ? problem["changed"].asBool() : !reads && !problem.isMember("code");
    return changed ? "Part of the change may be in effect: check 'veltctl status' and 'veltctl log'. The "
                     "server's own log says more."
                   : "Fix the problem that the server names, then try again.";
}

/// What is wrong need not be in what was sent: a certificate may not fit its key.
std::string refusalHint(const Json::Value& problem) {
    const bool ofServer = problem.isMember("code") && problem["errors"].empty();
    return ofServer ? mendOnServer : "Correct the input and try again.";
}

std::string absenceHint(const std::string& path) {
    if (path.starts_with("/api/bans/")) {
        return "'veltctl bans list' lists the bans.";
    }
    if (path.starts_with("/api/keys")) {
        return "'veltctl keys list' lists the keys.";
    }
    if (path.starts_with("/api/sessions/")) {
        return "'veltctl sessions' lists the sessions.";
    }
    if (path.starts_with(historyPath) || path == "/api/diff") {
        return "'veltctl history' lists the changes.";
    }
    return path.starts_with("/api/tokens/") ? "'veltctl tokens list' lists the tokens."
                                            : "'veltctl call --list' lists the methods.";
}

std::string hintOf(long status, const Json::Value& problem, const ServerAddress& server,
                   const AskedFor& asked) {
    switch (status) {
    case 401:
    case 403:
        return accessHint(status, server);
    case 404:
    case 405:
        return absenceHint(asked.path);
    case 408:
    case 429:
        return "Try again in a moment.";
    case 409:
        return conflictHint(problem, asked.path);
    case 412:
        return "Read them again, and repeat the change.";
    default:
        break;
    }
    if (status >= 500) {
        return failureHint(problem, asked);
    }
    return status >= 400 ? refusalHint(problem) : checkAddress;
}

// Adds what the server's detail does not say already.
void addNotes(Failure& failure, const Json::Value& problem) {
    const std::string detail = textAt(problem, "detail");
    const auto add = [&](const std::string& fact, const std::string& note) {
        if (!fact.empty() && detail.find(fact) == std::string::npos) {
            failure.note(note);
        }
    };
    const std::string holder = textAt(problem, "holder");
    const Json::Value noErrors;
    const Json::Value& errors = problem["errors"];
    // That a free port is expected goes without saying when somebody holds the other one.
    for (const Json::Value& error : errors.isArray() && holder.empty() ? errors : noErrors) {
        const std::string fact = textAt(error, "field") + ": expected " + textAt(error, "expected");
        add(fact, fact);
    }
    add(holder, "held by " + holder);
    if (problem["changed"] == false && detail.find("as it was before") == std::string::npos) {
        add("Nothing was changed.", "Nothing was changed.");
    }
    if (const std::string id = textAt(problem, "request_id"); !id.empty()) {
        failure.note("request id " + id);
    }
}

} // namespace

Failure failureFrom(const HttpAnswer& answer, const ServerAddress& server, const AskedFor& asked) {
    Json::Value problem = parseJson(answer.body).valueOr({});
    if (!problem.isObject()) {
        problem = Json::Value(Json::objectValue);
    }
    const std::string code = textAt(problem, "code");
    const std::string title = textAt(problem, "title");
    const std::string detail = textAt(problem, "detail");
    // The title of any other problem is the name of its status.
    const bool titleTells = !title.empty() && (!code.empty() || problem.isMember("changed"));
    const Meaning& meaning = meaningOf(answer.status);
    Failure failure(meaning.code,
                    (titleTells ? title : meaning.message) + " (HTTP " + std::to_string(answer.status) +
                        (code.empty() ? "" : ", code " + code) + ").",
                    hintOf(answer.status, problem, server, asked));
    if (!detail.empty()) {
        failure.note(detail);
    } else if (!titleTells && !title.empty()) {
        failure.note(title);
    }
    addNotes(failure, problem);
    return failure;
}

Failure unexpectedAnswer(const std::string& message) {
    return {ExitCode::platform, message,
            "Compare 'veltctl --version' with 'veltctl status': both should be of the same release."};
}

} // namespace velt::cli
