// The web API framework: requests, responses, the port registry, and the table by which a module says
// what it serves.
//
// Threads: a request and its response belong to the thread that runs the entry function. Entry functions and
// IsPortConflict may be called from any thread.
#ifndef VELT_PLATFORM_WEBAPI_H
#define VELT_PLATFORM_WEBAPI_H

#include <json/value.h>

#include <cstddef>
#include <string>

namespace VELT {

/// One request. The framework owns it and keeps its state behind this interface (in a class derived
/// from it); a module only holds its address for the time of one entry function.
class APIRequest {
public:
    /// Returns the parameter called `name`, or a copy of `defaultValue` when there is none. The empty
    /// name stands for all parameters of the request, as one JSON object. Any exception passes through
    /// the module.
    Json::Value GetParam(const std::string& name, const Json::Value& defaultValue);
};

/// The answer to one request, owned by the framework. A module calls exactly one of the two operations,
/// once.
class APIResponse {
public:
    /// The request succeeded with `data`; null is an answer without data.
    void SetSuccess(const Json::Value& data);

    /// The request failed with the numeric `code`; `data` is null.
    void SetError(int code, const Json::Value& data);
};

/// Serves one request: sets exactly one answer on the response, or lets an exception pass.
using APIEntryFunction = void (*)(APIRequest*, APIResponse*);

/// One row of a module's API table. The table ends with a row in which every field is zero.
struct APITableRow {
    const char* api;
    int version;
    const char* method;
    APIEntryFunction entry;
};

static_assert(offsetof(APITableRow, api) == 0);
static_assert(offsetof(APITableRow, version) == sizeof(const char*));
static_assert(offsetof(APITableRow, method) == 2 * sizeof(const char*));
static_assert(offsetof(APITableRow, entry) == 3 * sizeof(const char*));
static_assert(sizeof(APITableRow) == 4 * sizeof(const char*));

} // namespace VELT

namespace WebUtils {

/// Non-zero when a port of firstPort..lastPort (one port: first and last are equal) is taken by a
/// service other than the named one ("ftp" or "ssh"), whose own current ports are no conflict.
int IsPortConflict(const char* service, int firstPort, int lastPort);

} // namespace WebUtils

#endif
