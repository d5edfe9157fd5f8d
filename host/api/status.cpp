#include "host/api/status.h"

#include "base/json_value.h"
#include "host/api/problem.h"
#include "host/api/service_status.h"

#include <chrono>

namespace velt::host {

namespace {

using Clock = std::chrono::steady_clock;

std::uint64_t sessionsOf(const std::string& service, const ActivityTotals& activity) {
    const auto protocol = protocolNamed(service);
    const auto found = protocol ? activity.sessions.find(*protocol) : activity.sessions.end();
    return found == activity.sessions.end() ? 0 : found->second;
}

HttpResponse status(const ModuleTable& table, Clock::time_point start, const Call& call) {
    const auto uptime = std::chrono::duration_cast<std::chrono::seconds>(Clock::now() - start);
    const ActivityTotals activity = activityTotals();
    const auto describe = [&activity](const Service& service) {
        Json::Value object = toObject(service);
        object["sessions"] = Json::UInt64{sessionsOf(service.name, activity)};
        return object;
    };
    return jsonResponse(200,
                        jsonObject({{"version", VELT_VERSION},
                                    {"uptime_seconds", Json::Int64{uptime.count()}},
                                    {"lost_records", Json::UInt64{lostRecords()}},
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
