#include "host/api/bans.h"

#include "base/json_value.h"
#include "base/utc_text.h"
#include "host/api/changes.h"
#include "host/api/problem.h"
#include "host/module/platform_request.h"

#include <algorithm>
#include <variant>

namespace velt::host {

namespace {

constexpr std::uint32_t liftedEvent = 0x11BF0002;

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

HttpResponse noSuchBan(const std::string& address, const Call& call) {
    return problem(404, "There is no ban of " + address + ".", call.id);
}

/// What lifting the ban would do. The platform writes the entry itself.
HttpResponse liftPlan(const std::string& address, const Call& call) {
    const auto current = currentBans();
    if (!current) {
        return problem(500, current.error().message, call.id);
    }
    const auto source = parseIpNetwork(address);
    const auto isMeant = [&](const Ban& ban) { return source && ban.source.contains(*source); };
    const auto ban = std::ranges::find_if(current->bans, isMeant);
    if (ban == current->bans.end()) {
        return noSuchBan(address, call);
    }
    return dryRunAnswer({{StepKind::store, "bans"},
                         {StepKind::logEntry, velt::sentenceOf(liftedEvent, {toText(ban->source)})}});
}

HttpResponse lift(HostLog& log, const Call& call) {
    const auto dryRun = parseDryRun(call.request.query());
    if (const auto* const bad = std::get_if<FieldError>(&dryRun)) {
        return fieldProblem(400, *bad, " No ban was lifted.", call.id);
    }
    const std::string& address = call.path.back();
    if (std::get<bool>(dryRun)) {
        return liftPlan(address, call);
    }
    const PlatformRequest request(call.principal.actor, call.principal.address);
    const auto lifted = liftBan(address);
    if (!lifted) {
        log.write(call.id, lifted.error().message);
        return problem(500, lifted.error().message, call.id);
    }
    if (!*lifted) {
        return noSuchBan(address, call);
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
