// Trying a failed start again.
#ifndef VELT_STANDALONE_CONTROL_START_RETRY_H
#define VELT_STANDALONE_CONTROL_START_RETRY_H

#include "standalone/daemons/daemon.h"
#include "standalone/supervise/daemon_state.h"

#include <chrono>
#include <optional>
#include <string>

namespace velt {

/// When a daemon that is switched on, and whose last start failed, is to be started again: as soon as one of
/// its ports is free or one of the files changes that it is started from, and every half minute. Not after it
/// has served since the failure: who ended it then, ended it on purpose.
class StartRetry {
public:
    using Clock = std::chrono::steady_clock;

    explicit StartRetry(const Daemon& daemon) : daemon_(daemon) {}

    /// To be asked twice a second. True: now is the time.
    bool isDue(const DaemonState& state, Clock::time_point now = Clock::now());

private:
    std::string surroundings() const;

    const Daemon& daemon_;
    std::string note_;        ///< what is known of the failure; "": none
    bool served_ = false;     ///< since then
    std::string last_;        ///< the surroundings of the last try
    Clock::time_point tried_; ///< when that was
};

} // namespace velt

#endif
