// What happens to a daemon without this process having asked for it.
#ifndef VELT_STANDALONE_CONTROL_DAEMON_INCIDENTS_H
#define VELT_STANDALONE_CONTROL_DAEMON_INCIDENTS_H

#include "standalone/daemons/daemon.h"
#include "standalone/supervise/daemon_state.h"

#include <optional>
#include <string>
#include <vector>

namespace velt {

struct Incident {
    enum class Kind {
        ended,     ///< it died
        recovered, ///< it serves again after that, or after a failed start
        started,   ///< by another program
        stopped,   ///< by another program
        failed,    ///< its start, when veltd began
    };

    Kind kind = Kind::ended;
    std::string reason; ///< of an end, or a failure: a part of a sentence

    bool operator==(const Incident&) const = default;
};

/// Tells the incidents of one daemon from its states, looked at one after the other.
class IncidentTeller {
public:
    /// What happened since the last look. `byUs`: operations of this process may have made the difference;
    /// `lost`: its supervisor ended without having been asked to.
    std::vector<Incident> look(const DaemonState& now, bool byUs, bool lost);

    /// Whether it will tell so when the daemon runs at the next look.
    bool tellsRecovery() const { return down_; }

private:
    std::vector<Incident> compare(const DaemonState& now);

    std::optional<DaemonState> last_;
    bool down_ = false; ///< its end was told, and that it is back was not
};

/// Writes the incident into the administrator log and announces it, on behalf of nobody. What cannot be
/// written goes to syslog.
void recordIncident(const Daemon& daemon, const Incident& incident);

} // namespace velt

#endif
