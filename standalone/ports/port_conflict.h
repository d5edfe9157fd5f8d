// The port test of the web interface, and who it found.
#ifndef VELT_STANDALONE_PORTS_PORT_CONFLICT_H
#define VELT_STANDALONE_PORTS_PORT_CONFLICT_H

#include <string>

namespace velt {

/// Why the calling thread's last WebUtils::IsPortConflict answered that there is a conflict, as one sentence that names the
/// port and who holds it; "" when there was none.
const std::string& lastPortHolder();

} // namespace velt

#endif
