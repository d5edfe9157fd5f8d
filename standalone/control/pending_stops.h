// What the request of a thread has put off.
#ifndef VELT_STANDALONE_CONTROL_PENDING_STOPS_H
#define VELT_STANDALONE_CONTROL_PENDING_STOPS_H

#include "standalone/control/service_request.h"
#include "standalone/daemons/daemon.h"
#include "standalone/supervise/daemon_order.h"

#include <map>
#include <set>
#include <vector>

namespace velt {

/// The request of one thread, if one is open.
struct PendingStops {
    enum class Kind {
        pause,
        stop
    };

    int depth = 0;          ///< of requests within one another; 0: none is open
    bool finishing = false; ///< nothing is put off any more
    SessionPolicy policy = SessionPolicy::byChange;
    std::map<const Daemon*, Kind> waiting;
    std::set<const Daemon*> ended; ///< whose sessions were to end and have, once in a request
    std::vector<ServiceSessions> sessions;

    bool isOpen() const { return depth > 0; }

    /// Adds to what is told at the end of the request.
    void count(const Daemon& daemon, const SessionCount& sessions);
};

/// The calling thread's.
PendingStops& pendingStops();

} // namespace velt

#endif
