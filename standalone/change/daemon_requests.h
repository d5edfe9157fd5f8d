// What a request asks of the daemons while its change is staged.
#ifndef VELT_STANDALONE_CHANGE_DAEMON_REQUESTS_H
#define VELT_STANDALONE_CHANGE_DAEMON_REQUESTS_H

#include "standalone/core/effects.h"
#include "standalone/daemons/daemon.h"

#include <string>
#include <string_view>
#include <vector>

namespace velt {

/// While it lives, the effects of its thread that stagings cannot hold are not done but noted: starts, stops,
/// the firewall, and keys and certificates that are made when a daemon needs them. A start or stop that would
/// fail fails. All others are left to the hook that the thread had before. Stays on its thread.
class DaemonRequests {
public:
    struct Wish {
        const Daemon* daemon;
        bool start; ///< the last that was asked for: a start, or a stop
        bool renew; ///< a start that is to exchange a daemon which runs as it should
    };

    DaemonRequests();
    ~DaemonRequests();
    DaemonRequests(const DaemonRequests&) = delete;
    DaemonRequests& operator=(const DaemonRequests&) = delete;

    /// Of each daemon that was asked for something, in the order of the first time.
    const std::vector<Wish>& wishes() const { return wishes_; }

    /// Whether the firewall was to be loaded.
    bool firewall() const { return firewall_; }

    /// The keys and certificates that a start would make: "certificate", "host keys".
    const std::vector<std::string>& missingKeys() const { return missingKeys_; }

private:
    EffectDecision decide(Effect effect, std::string_view subject);
    EffectDecision leave(Effect effect, std::string_view subject) const;
    Result<> wish(std::string_view service, bool start, bool renew);

    EffectHook outer_;
    std::vector<Wish> wishes_;
    std::vector<std::string> missingKeys_;
    bool firewall_ = false;
};

} // namespace velt

#endif
