#include "host/api/user_access.h"

#include "base/json_text.h"
#include "host/api/failure_kind.h"
#include "host/api/problem.h"
#include "host/base/query_text.h"
#include "standalone/standalone.h"

#include <variant>

namespace velt::host {

namespace {

struct Question {
    std::string user;
    std::string path; ///< "": only the view
};

std::variant<Question, FieldError> parseQuestion(const std::string& query) {
    const auto parameters = queryParameters(query);
    if (const auto repeated = repeatedKey(parameters)) {
        return FieldError{*repeated, oneValue};
    }
    Question question;
    for (const QueryParameter& parameter : parameters) {
        const bool isUser = parameter.key == "user";
        if (!isUser && parameter.key != "path") {
            return FieldError{parameter.key, "user or path"};
        }
        if (!parameter.value || parameter.value->find('\0') != std::string::npos) {
            return FieldError{parameter.key, "percent-encoded UTF-8 without U+0000"};
        }
        (isUser ? question.user : question.path) = *parameter.value;
    }
    if (question.user.empty()) {
        return FieldError{"user", "the name of a user"};
    }
    if (!question.path.empty() && question.path.front() != '/') {
        return FieldError{"path", "an absolute path on the server"};
    }
    return question;
}

HttpResponse answer(const Call& call) {
    const auto parsed = parseQuestion(call.request.query());
    if (const auto* const bad = std::get_if<FieldError>(&parsed)) {
        return fieldProblem(400, *bad, "", call.id);
    }
    const auto& question = std::get<Question>(parsed);
    const auto report = reportAccess(question.user, question.path);
    if (!report) {
        const bool unknown = report.error().number == ErrorNumber::notFound;
        return problem(unknown ? 404 : 422, report.error().message, call.id);
    }
    const auto json = parseJson(*report);
    return json ? jsonResponse(200, *json) : problem(500, "The report is not JSON.", call.id);
}

} // namespace

std::vector<Route> accessRoutes() {
    // For administrators: it tells which files there are anywhere on the server.
    return {{"GET", {"api", "access"}, true, RequestOrder::Kind::unordered, answer}};
}

} // namespace velt::host
