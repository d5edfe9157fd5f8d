#include "cli/server_refusal.h"

#include "cli/json_io.h"

namespace velt::cli {

namespace {

constexpr int codeShareUnreachable = 1905;

ExitCode exitCodeOf(long status) {
    switch (status) {
    case 401:
    case 403:
    case 408:
    case 429:
        return ExitCode::access;
    case 409:
        return ExitCode::conflict;
    default:
        break;
    }
    if (status >= 500) {
        return ExitCode::platform;
    }
    return status >= 400 ? ExitCode::refused : ExitCode::access;
}

std::string messageOf(long status) {
    switch (status) {
    case 401:
        return "The server requires authentication";
    case 403:
        return "The server does not allow this";
    case 404:
        return "The server cannot find this";
    case 405:
        return "The server does not support this method";
    case 408:
    case 429:
        return "The server is busy";
    case 409:
        return "The request conflicts with something else on the server";
    default:
        break;
    }
    if (status >= 500) {
        return "The server failed to carry out the request";
    }
    return status >= 400 ? "The server refused the input" : "The answer is not from veltd";
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

std::string conflictHint(const Json::Value& problem) {
    if (problem["code"] == codeShareUnreachable) {
        return "Choose another share ('veltctl shares' lists them), let the account ftp read this one, or "
               "switch anonymous_chroot off.";
    }
    return "Choose another port, or free this one.";
}

// A refusal of the module says whether anything was changed, unless its method only reads.
std::string failureHint(const Json::Value& problem, bool reads) {
    const bool changed =
        problem["changed"].isBool() ? problem["changed"].asBool() : !reads && !problem.isMember("code");
    return changed ? "Part of the change may be in effect: check 'veltctl status' and 'veltctl log'. The "
                     "server's own log says more."
                   : "Fix what the server names, in the request or on the server, and try again.";
}

std::string hintOf(long status, const Json::Value& problem, const ServerAddress& server, bool reads) {
    switch (status) {
    case 401:
    case 403:
        return accessHint(status, server);
    case 404:
    case 405:
        return "'veltctl call --list' lists the methods, 'veltctl tokens list' the tokens.";
    case 408:
    case 429:
        return "Try again in a moment.";
    case 409:
        return conflictHint(problem);
    default:
        break;
    }
    if (status >= 500) {
        return failureHint(problem, reads);
    }
    return status >= 400 ? "Correct the input and try again." : checkAddress;
}

// The server's detail may have the fact in a sentence already.
void addMissing(Failure& failure, const std::string& detail, const std::string& fact,
                const std::string& note) {
    if (!fact.empty() && detail.find(fact) == std::string::npos) {
        failure.note(note);
    }
}

void addFields(Failure& failure, const std::string& detail, const Json::Value& errors) {
    if (!errors.isArray()) {
        return;
    }
    for (const Json::Value& error : errors) {
        const std::string fact = textAt(error, "field") + ": expected " + textAt(error, "expected");
        addMissing(failure, detail, fact, fact);
    }
}

} // namespace

Failure failureFrom(const HttpAnswer& answer, const ServerAddress& server, bool reads) {
    Json::Value problem = parseJson(answer.body).value_or(Json::Value());
    if (!problem.isObject()) {
        problem = Json::Value(Json::objectValue);
    }
    const std::string code = textAt(problem, "code");
    const std::string title = textAt(problem, "title");
    const std::string detail = textAt(problem, "detail");
    // The title of any other problem is the name of its status.
    const bool titleTells = !title.empty() && (!code.empty() || problem.isMember("changed"));
    Failure failure(exitCodeOf(answer.status),
                    (titleTells ? title : messageOf(answer.status)) + " (HTTP " +
                        std::to_string(answer.status) + (code.empty() ? "" : ", code " + code) + ").",
                    hintOf(answer.status, problem, server, reads));
    if (!detail.empty()) {
        failure.note(detail);
    } else if (!titleTells && !title.empty()) {
        failure.note(title);
    }
    addFields(failure, detail, problem["errors"]);
    const std::string holder = textAt(problem, "holder");
    addMissing(failure, detail, holder, "held by " + holder);
    if (problem["changed"] == false) {
        const std::string nothing = "Nothing was changed.";
        addMissing(failure, detail, nothing, nothing);
    }
    if (const std::string id = textAt(problem, "request_id"); !id.empty()) {
        failure.note("request id " + id);
    }
    return failure;
}

Failure unexpectedAnswer(const std::string& message) {
    return {ExitCode::platform, message,
            "Compare 'veltctl --version' with 'veltctl status': both should be of the same release."};
}

} // namespace velt::cli
