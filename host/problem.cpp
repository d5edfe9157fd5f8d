#include "host/problem.h"

#include "host/json_text.h"

#include <algorithm>
#include <array>
#include <utility>

namespace velt::host {

const char* reasonPhrase(int status) {
    static constexpr std::array<std::pair<int, const char*>, 20> phrases{{
        {200, "OK"},
        {201, "Created"},
        {204, "No Content"},
        {400, "Bad Request"},
        {401, "Unauthorized"},
        {403, "Forbidden"},
        {404, "Not Found"},
        {405, "Method Not Allowed"},
        {408, "Request Timeout"},
        {409, "Conflict"},
        {412, "Precondition Failed"},
        {413, "Content Too Large"},
        {417, "Expectation Failed"},
        {422, "Unprocessable Content"},
        {431, "Request Header Fields Too Large"},
        {500, "Internal Server Error"},
        {501, "Not Implemented"},
        {503, "Service Unavailable"},
        {505, "HTTP Version Not Supported"},
        {507, "Insufficient Storage"},
    }};
    const auto* const found = std::find_if(phrases.begin(), phrases.end(),
                                           [status](const auto& each) { return each.first == status; });
    return found == phrases.end() ? "Unknown" : found->second;
}

HttpResponse problem(int status, const std::string& detail, const std::string& requestId) {
    Json::Value members(Json::objectValue);
    members["detail"] = detail;
    return problemWith(status, std::move(members), requestId);
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

HttpResponse fieldProblem(int status, const FieldError& error, const std::string& extent,
                          const std::string& requestId) {
    Json::Value members(Json::objectValue);
    members["detail"] = error.field + ": expected " + error.expected + "." + extent;
    members["errors"].append(toObject(error));
    return problemWith(status, std::move(members), requestId);
}

Json::Value toObject(const FieldError& error) {
    Json::Value object(Json::objectValue);
    object["field"] = error.field;
    object["expected"] = error.expected;
    return object;
}

HttpResponse jsonResponse(int status, const Json::Value& value) {
    return {status, "application/json", toJson(value), {}};
}

} // namespace velt::host
