// The port test of the web interface, and who it found.
#ifndef VELT_STANDALONE_PORTS_PORT_CONFLICT_H
#define VELT_STANDALONE_PORTS_PORT_CONFLICT_H

#include <string>

namespace velt {

/// Who holds the port of the calling thread's last WebUtils::IsPortConflict, in words ("nginx (process 812)"); "" when there was no
/// conflict, or when the numbers themselves were wrong. The last error has the whole sentence, and lastPortConflict
/// (standalone/standalone.h) the port as well.
const std::string& lastPortHolder();

} // namespace velt

#endif
