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
        return "The server does not know who asks";
    case 403:
        return "The server does not allow this";
    case 404:
        return "The server does not have what was asked for";
    case 405:
        return "The server has no such method";
    case 408:
    case 429:
        return "The server did not take the request now";
    case 409:
        return "The request is in conflict with something else on the server";
    default:
        break;
    }
    if (status >= 500) {
        return "The server failed to do it";
    }
    return status >= 400 ? "The server refused the input" : "The answer is not that of a veltd";
}

std::string accessHint(long status, const ServerAddress& server) {
    if (!server.socket.empty()) {
        return "Run veltctl as root or as a member of the group velt-admin.";
    }
    if (status == 403) {
        return "Use a token of the role admin: this one may only read.";
    }
    return server.token.empty() ? "Give a token in VELT_TOKEN or with --token-file; 'veltctl tokens "
                                  "create', run as root on the "
                                  "server, makes one."
                                : "The token is not valid (any more): 'veltctl tokens create', run as root "
                                  "on the server, makes one.";
}

std::string conflictHint(const Json::Value& problem) {
    if (problem.isObject() && problem["code"] == codeShareUnreachable) {
        return "Choose another share ('veltctl shares' lists them), let the account ftp read this one, or "
               "switch "
               "anonymous_chroot off. Nothing was changed.";
    }
    return "Choose another port, or free this one. Nothing was changed.";
}

std::string hintOf(const HttpAnswer& answer, const Json::Value& problem, const ServerAddress& server) {
    switch (answer.status) {
    case 401:
    case 403:
        return accessHint(answer.status, server);
    case 404:
    case 405:
        return "'veltctl call --list' shows the methods, 'veltctl tokens list' the tokens.";
    case 408:
    case 429:
        return "Try again in a moment.";
    case 409:
        return conflictHint(problem);
    default:
        break;
    }
    if (answer.status >= 500 && problem["changed"] == false) {
        return "Correct what the server names, in the request or on the server, and try again.";
    }
    if (answer.status >= 500) {
        return "A part of the change may be in effect: look with 'veltctl status' and 'veltctl log'; the "
               "server's own "
               "log tells more.";
    }
    return answer.status >= 400 ? "Correct the input and try again. Nothing was changed."
                                : "Check that the address is that of veltd (--url, VELT_URL).";
}

void addFields(Failure& failure, const Json::Value& problem) {
    const Json::Value& errors = problem["errors"];
    if (!errors.isArray()) {
        return;
    }
    for (const Json::Value& error : errors) {
        failure.note(textAt(error, "field") + ": expected " + textAt(error, "expected"));
    }
}

} // namespace

Failure failureFrom(const HttpAnswer& answer, const ServerAddress& server) {
    std::string unreadable;
    Json::Value problem = parseJson(answer.body, unreadable).value_or(Json::Value());
    if (!problem.isObject()) {
        problem = Json::Value(Json::objectValue);
    }

    std::string brackets = "HTTP " + std::to_string(answer.status);
    if (const std::string code = textAt(problem, "code"); !code.empty()) {
        brackets += ", code " + code;
    }
    Failure failure(exitCodeOf(answer.status), messageOf(answer.status) + " (" + brackets + ").",
                    hintOf(answer, problem, server));
    const std::string title = textAt(problem, "title");
    const std::string detail = textAt(problem, "detail");
    if (!title.empty() && title != detail) {
        failure.note(title);
    }
    if (!detail.empty()) {
        failure.note(detail);
    }
    addFields(failure, problem);
    if (const std::string holder = textAt(problem, "holder"); !holder.empty()) {
        failure.note("held by " + holder);
    }
    if (const std::string id = textAt(problem, "request_id"); !id.empty()) {
        failure.note("request id " + id);
    }
    return failure;
}

} // namespace velt::cli
