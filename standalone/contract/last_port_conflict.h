// Who holds the port that the contract's IsPortConflict refused: it answers with a number alone.
#ifndef VELT_STANDALONE_CONTRACT_LAST_PORT_CONFLICT_H
#define VELT_STANDALONE_CONTRACT_LAST_PORT_CONFLICT_H

#include "standalone/control/port_conflict.h"

namespace velt {

/// What the calling thread's last IsPortConflict found; port 0 when there was no conflict.
PortConflict lastPortConflict();

} // namespace velt

#endif
