#include "host/api/restart.h"

#include "base/json_value.h"
#include "host/api/problem.h"
#include "host/base/query_text.h"
#include "host/module/platform_request.h"

#include <algorithm>
#include <variant>

namespace velt::host {

namespace {

struct Wish {
    std::string service; ///< "" for all
    SessionPolicy sessions = SessionPolicy::keep;
};

bool isService(const std::string& name) {
    return std::ranges::count(storedServices(), name, &StoredService::daemon) != 0;
}

/// Reads "service=ftp&sessions=end".
std::variant<Wish, FieldError> wishIn(const std::string& query) {
    Wish wish;
    for (const auto& [key, value] : queryParameters(query)) {
        if (key == "service" && value && isService(*value)) {
            wish.service = *value;
        } else if (key == "sessions" && (value == "keep" || value == "end")) {
            wish.sessions = value == "end" ? SessionPolicy::end : SessionPolicy::keep;
        } else {
            return FieldError{key, key == "service"    ? "ftp or sftp"
                                   : key == "sessions" ? "keep or end"
                                                       : "service or sessions"};
        }
    }
    return wish;
}

Json::Value toObject(const ServiceSessions& sessions) {
    return jsonObject({{"service", sessions.service}, {"ended", sessions.ended}, {"kept", sessions.kept}});
}

HttpResponse restart(HostLog& log, const Call& call) {
    const auto wish = wishIn(call.request.query());
    if (const auto* const bad = std::get_if<FieldError>(&wish)) {
        return fieldProblem(400, *bad, "", call.id);
    }
    const PlatformRequest request(call.principal.actor, call.principal.address);
    const auto& [service, policy] = std::get<Wish>(wish);
    const auto done = restartServices(policy, service);
    if (!done) {
        log.write(call.id, "restart: " + done.error().message);
        return problem(500, done.error().message, call.id);
    }
    return jsonResponse(200, jsonObject({{"services", jsonArray(*done, [](const ServiceSessions& each) {
                                              return toObject(each);
                                          })}}));
}

} // namespace

Route restartRoute(HostLog& log) {
    return {"POST", {"api", "restart"}, true, RequestOrder::Kind::write, [&log](const Call& call) {
                return restart(log, call);
            }};
}

} // namespace velt::host
