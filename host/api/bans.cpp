#include "host/api/bans.h"

#include "base/json_value.h"
#include "base/utc_text.h"
#include "host/api/problem.h"
#include "host/module/platform_request.h"

namespace velt::host {

namespace {

Json::Value toObject(const Ban& ban) {
    return jsonObject({{"address", toText(ban.source)},
                       {"service", ban.service},
                       {"failures", ban.failures},
                       {"until", timestamp(ban.until)}});
}

HttpResponse list(const Call& call) {
    const auto current = currentBans();
    if (!current) {
        return problem(500, current.error().message, call.id);
    }
    const auto describe = [](const Ban& ban) { return toObject(ban); };
    return jsonResponse(
        200, jsonObject({{"bans", jsonArray(current->bans, describe)}, {"firewall", current->firewall}}));
}

HttpResponse lift(HostLog& log, const Call& call) {
    const std::string& address = call.path.back();
    const PlatformRequest request(call.principal.actor, call.principal.address);
    const auto lifted = liftBan(address);
    if (!lifted) {
        log.write(call.id, lifted.error().message);
        return problem(500, lifted.error().message, call.id);
    }
    if (!*lifted) {
        return problem(404, "There is no ban of " + address + ".", call.id);
    }
    log.write(call.id, "ban of " + address + " lifted by " + call.principal.actor);
    return {204, "", "", {}};
}

} // namespace

std::vector<Route> banRoutes(HostLog& log) {
    using Kind = RequestOrder::Kind;
    return {
        {"GET", {"api", "bans"}, false, Kind::unordered, list},
        {"DELETE",
         {"api", "bans", "*"},
         true,
         Kind::unordered,
         [&log](const Call& call) { return lift(log, call); }},
    };
}

} // namespace velt::host
