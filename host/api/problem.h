// Answers that say what went wrong: application/problem+json, RFC 9457.
#ifndef VELT_HOST_API_PROBLEM_H
#define VELT_HOST_API_PROBLEM_H

#include "base/result.h"
#include "host/http/message.h"

#include <json/value.h>

#include <string>

namespace velt::host {

/// A field with a wrong value.
struct FieldError {
    std::string field;    ///< "portnum", "rules[2].name"
    std::string expected; ///< "a number from 1 to 65535"
};

/// A problem that no module took part in; its title is the reason phrase.
HttpResponse problem(int status, const std::string& detail, const std::string& requestId);

/// What failed before anything of a change was done, and says so: the platform's failure, with the status of
/// its kind, or another one with 500.
HttpResponse failedUnchanged(const Error& failure, const std::string& requestId);
HttpResponse failedUnchanged(const std::string& sentence, const std::string& requestId);

/// A problem with these members; missing ones of RFC 9457 are filled in.
HttpResponse problemWith(int status, Json::Value members, const std::string& requestId);

/// A body that is not a JSON object, for the reason given; `extent` says what was done.
HttpResponse notAnObject(const Error& reason, const std::string& extent, const std::string& requestId);

/// A problem with one field of what was sent; `extent` says what was done.
HttpResponse fieldProblem(int status, const FieldError& error, const std::string& extent,
                          const std::string& requestId);

/// The problem of a request that has a body although its method takes parameters of the query only: what the
/// body asks for would not be done. Nothing without a body, or for an empty object.
std::optional<HttpResponse> bodyProblem(const std::string& body, const std::string& requestId);

/// {"field", "expected"}
Json::Value toObject(const FieldError& error);

/// A JSON value with its status.
HttpResponse jsonResponse(int status, const Json::Value& value);

} // namespace velt::host

#endif
