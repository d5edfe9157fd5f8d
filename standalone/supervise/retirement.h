// The end of a daemon whose successor listens already.
#ifndef VELT_STANDALONE_SUPERVISE_RETIREMENT_H
#define VELT_STANDALONE_SUPERVISE_RETIREMENT_H

#include "base/unique_fd.h"
#include "standalone/process/process_identity.h"

#include <chrono>
#include <vector>

namespace velt {

/// Ends the daemon without its sessions. Where both listen on one port, the kernel gives all new connections
/// to the successor, and the former daemon stays until it has taken those that were its own by then; one
/// whose client is still about to answer belongs to it as well. Belongs to one thread.
class Retirement {
public:
    using Clock = std::chrono::steady_clock;

    Retirement(const ProcessId& former, const ProcessId& successor, const std::vector<int>& ports);

    /// Ends the former daemon when nobody needs it any more. True when it has ended.
    bool proceed();

    /// Ends it at once, but for the few milliseconds that it may need for what waits at its port.
    void finish();

    /// When it is worth while to look again.
    Clock::time_point nextLook() const;

private:
    bool isIdle() const;
    void end();

    ProcessId former_;
    std::vector<UniqueFd> listeners_; ///< the former daemon's, of which new connections are kept away
    Clock::time_point began_ = Clock::now();
};

} // namespace velt

#endif
