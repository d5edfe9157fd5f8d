#include "host/api/status.h"

#include "base/json_value.h"
#include "host/api/problem.h"
#include "host/api/service_status.h"

#include <chrono>

namespace velt::host {

namespace {

using Clock = std::chrono::steady_clock;

HttpResponse status(const ModuleTable& table, Clock::time_point start, const Call& call) {
    const auto uptime = std::chrono::duration_cast<std::chrono::seconds>(Clock::now() - start);
    const auto describe = [](const Service& service) { return toObject(service); };
    return jsonResponse(200,
                        jsonObject({{"version", VELT_VERSION},
                                    {"uptime_seconds", Json::Int64{uptime.count()}},
                                    {"services", jsonArray(listServices(table, call.principal), describe)}}));
}

} // namespace

std::vector<Route> statusRoutes(const ModuleTable& table) {
    using Kind = RequestOrder::Kind;
    return {
        {"GET",
         {"api", "status"},
         false,
         Kind::read,
         [&table, start = Clock::now()](const Call& call) { return status(table, start, call); }},
    };
}

} // namespace velt::host
