// Several daemons that are to reach their state together, though one may hold the port of another.
#ifndef VELT_STANDALONE_CONTROL_BRING_DAEMONS_H
#define VELT_STANDALONE_CONTROL_BRING_DAEMONS_H

#include "base/result.h"
#include "standalone/daemons/daemon.h"

#include <functional>
#include <vector>

namespace velt {

/// Whether the daemon listens on a port that the other is to have by the stored settings.
bool isInTheWay(const Daemon& daemon, const Daemon& other);

/// One that could not be brought there.
struct DaemonFailure {
    const Daemon* daemon = nullptr;
    Error error;
};

/// Does `bring` with each of the daemons. Those that find their port taken are tried again after the others;
/// where they only wait for one another, one that can goes out of the way by a pause. Returns what failed.
std::vector<DaemonFailure> bringDaemons(std::vector<const Daemon*> daemons,
                                        const std::function<Result<>(const Daemon&)>& bring);

} // namespace velt

#endif
