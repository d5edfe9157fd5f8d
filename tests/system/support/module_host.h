// The module in this process, and requests to it, as a host would make them.
#ifndef VELT_TESTS_SYSTEM_SUPPORT_MODULE_HOST_H
#define VELT_TESTS_SYSTEM_SUPPORT_MODULE_HOST_H

#include <json/json.h>

#include <string>

namespace velt::test {

struct ModuleAnswer {
    int code = -1;        ///< 0: success; -1: the module gave no answer, or more than one
    Json::Value data;     ///< of a success
    std::string sentence; ///< the platform's last error after the request
};

/// The actor and the address that the requests are made in the name of.
inline constexpr const char* requestActorName = "tester";
inline constexpr const char* requestActorAddress = "192.0.2.50";

/// Serves one request by the row of the module's table that has this API, version and method; the module is
/// loaded at the first one. Throws std::runtime_error when it cannot be loaded or has no such row.
ModuleAnswer requestModule(const std::string& api, int version, const std::string& method,
                           const Json::Value& parameters);

} // namespace velt::test

#endif
