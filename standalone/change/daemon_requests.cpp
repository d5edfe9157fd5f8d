#include "standalone/change/daemon_requests.h"

#include "standalone/control/daemon_control.h"
#include "standalone/control/supervised_daemon.h"

#include <algorithm>
#include <array>
#include <utility>

namespace velt {

namespace {

/// Stores that a daemon's start needs and no request asks for.
constexpr std::array<std::string_view, 2> madeByStarts{"certificate", "host keys"};

/// Whether what is asked could be done. A stop is the first half of a restart where the settings still want
/// the daemon: better no stop than one without a start.
Result<> checkWish(const Daemon& daemon, bool start) {
    return start || isServing(daemonState(daemon)) ? checkStart(daemon) : Result<>();
}

} // namespace

DaemonRequests::DaemonRequests() {
    outer_ =
        setEffectHook([this](Effect effect, std::string_view subject) { return decide(effect, subject); });
}

DaemonRequests::~DaemonRequests() {
    setEffectHook(std::move(outer_));
}

EffectDecision DaemonRequests::leave(Effect effect, std::string_view subject) const {
    return outer_ ? outer_(effect, subject) : std::nullopt;
}

EffectDecision DaemonRequests::decide(Effect effect, std::string_view subject) {
    switch (effect) {
    case Effect::start:
        return wish(subject, true, false);
    case Effect::restart:
        return wish(subject, true, true);
    case Effect::stop:
        return wish(subject, false, false);
    case Effect::firewall:
        firewall_ = true;
        return Result<>();
    case Effect::store:
        if (std::ranges::find(madeByStarts, subject) != madeByStarts.end()) {
            if (std::ranges::find(missingKeys_, subject) == missingKeys_.end()) {
                missingKeys_.emplace_back(subject);
            }
            return Result<>();
        }
        return leave(effect, subject);
    default:
        return leave(effect, subject);
    }
}

Result<> DaemonRequests::wish(std::string_view service, bool start, bool renew) {
    const Daemon* const daemon = daemonServing(service);
    auto known = std::ranges::find(wishes_, daemon, &Wish::daemon);
    // One daemon may serve under several names, and is asked for under each.
    if (known != wishes_.end() && known->start == start) {
        known->renew = known->renew || renew;
        return {};
    }
    VELT_RETURN_IF_ERROR(checkWish(*daemon, start));
    if (known == wishes_.end()) {
        wishes_.push_back({daemon, start, renew});
    } else {
        *known = {daemon, start, renew};
    }
    return {};
}

} // namespace velt
