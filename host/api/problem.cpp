#include "host/api/problem.h"

#include "base/json_value.h"
#include "host/api/failure_kind.h"
#include "host/base/json.h"
#include "host/http/response_text.h"

#include <utility>

namespace velt::host {

HttpResponse problem(int status, const std::string& detail, const std::string& requestId) {
    return problemWith(status, jsonObject({{"detail", detail}}), requestId);
}

HttpResponse failedUnchanged(const Error& failure, const std::string& requestId) {
    const FailureKind kind = kindOf(failure.number);
    return problemWith(kind.status,
                       jsonObject({{"title", kind.title},
                                   {"detail", failure.message + " Nothing was changed."},
                                   {"changed", false}}),
                       requestId);
}

HttpResponse failedUnchanged(const std::string& sentence, const std::string& requestId) {
    return failedUnchanged(Error(ErrorNumber::none, sentence), requestId);
}

HttpResponse problemWith(int status, Json::Value members, const std::string& requestId) {
    members["status"] = status;
    if (!members.isMember("title")) {
        members["title"] = reasonPhrase(status);
    }
    members["request_id"] = requestId;
    HttpResponse response = jsonResponse(status, members);
    response.contentType = "application/problem+json";
    return response;
}

HttpResponse notAnObject(const Error& reason, const std::string& extent, const std::string& requestId) {
    return problem(400, "The body is not a JSON object: " + reason.message + "." + extent, requestId);
}

HttpResponse fieldProblem(int status, const FieldError& error, const std::string& extent,
                          const std::string& requestId) {
    Json::Value members =
        jsonObject({{"detail", error.field + ": expected " + error.expected + "." + extent}});
    members["errors"].append(toObject(error));
    return problemWith(status, std::move(members), requestId);
}

std::optional<HttpResponse> bodyProblem(const std::string& body, const std::string& requestId) {
    if (body.empty() || body == "{}" || body == "{}\n") {
        return std::nullopt;
    }
    return problem(400,
                   "Expected no body: the options of this request are parameters of the query, such as "
                   "?dry_run=true. Nothing was changed.",
                   requestId);
}

Json::Value toObject(const FieldError& error) {
    return jsonObject({{"field", error.field}, {"expected", error.expected}});
}

HttpResponse jsonResponse(int status, const Json::Value& value) {
    return {status, "application/json", toJson(value), {}};
}

} // namespace velt::host
