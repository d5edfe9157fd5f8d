#include "standalone/control/service_request.h"

#include "standalone/control/daemon_control.h"
#include "standalone/control/pending_stops.h"
#include "standalone/core/effects.h"

#include <syslog.h>

#include <algorithm>
#include <exception>
#include <utility>

namespace velt {
namespace {

/// Does what was put off; after a failure with one daemon the others as well.
Result<> doWaiting(const std::map<const Daemon*, PendingStops::Kind>& waiting) {
    Result<> outcome;
    for (const auto& [daemon, kind] : waiting) {
        auto done = perform(Effect::stop, daemon->name, [daemon = daemon, kind = kind] {
            const auto settings = daemon->settings();
            const bool on = settings && settings->enabled();
            return on && kind == PendingStops::Kind::pause ? pauseDaemon(*daemon) : stopDaemon(*daemon);
        });
        outcome = outcome ? std::move(done) : outcome;
    }
    return outcome;
}

/// The request is over when this is, whatever happens meanwhile; nothing more is put off.
class RequestEnd {
public:
    explicit RequestEnd(PendingStops& request) : request_(request) { request_.finishing = true; }
    ~RequestEnd() { request_ = {}; }
    RequestEnd(const RequestEnd&) = delete;
    RequestEnd& operator=(const RequestEnd&) = delete;

private:
    PendingStops& request_;
};

} // namespace

PendingStops& pendingStops() {
    thread_local PendingStops request;
    return request;
}

void PendingStops::count(const Daemon& daemon, const SessionCount& counted) {
    if (!isOpen() || counted == SessionCount{}) {
        return;
    }
    auto found = std::ranges::find(sessions, daemon.apiName, &ServiceSessions::service);
    if (found == sessions.end()) {
        found = sessions.insert(found, {std::string(daemon.apiName), 0, 0});
    }
    found->ended += counted.ended;
    found->kept = counted.kept; // those who were there before are the same ones
}

ServiceRequest::ServiceRequest(SessionPolicy policy) {
    PendingStops& request = pendingStops();
    if (request.depth++ == 0) {
        request.policy = policy;
    }
}

ServiceRequest::~ServiceRequest() {
    if (!open_) {
        return;
    }
    try {
        if (const auto done = finish(); !done) {
            ::syslog(LOG_ERR, "%s", done.error().message.c_str());
        }
    } catch (const std::exception& error) {
        ::syslog(LOG_ERR, "cannot end a request: %s", error.what());
    }
}

Result<std::vector<ServiceSessions>> ServiceRequest::finish() {
    open_ = false;
    PendingStops& request = pendingStops();
    if (request.depth > 1) {
        --request.depth;
        return std::vector<ServiceSessions>();
    }
    const RequestEnd end(request);
    VELT_RETURN_IF_ERROR(doWaiting(std::exchange(request.waiting, {})));
    return request.sessions;
}

} // namespace velt
