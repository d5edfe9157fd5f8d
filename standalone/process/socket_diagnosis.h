// Asks the kernel for listening sockets alone. Its text tables have all sockets in them, and reading these
// takes milliseconds even where there are few.
#ifndef VELT_STANDALONE_PROCESS_SOCKET_DIAGNOSIS_H
#define VELT_STANDALONE_PROCESS_SOCKET_DIAGNOSIS_H

#include "standalone/process/listening_sockets.h"

#include <optional>
#include <vector>

namespace velt {

/// The listening TCP sockets, IPv4 and IPv6, of the calling thread's network namespace; nothing where the
/// kernel does not answer such questions.
std::optional<std::vector<ListeningSocket>> diagnoseListeningSockets();

} // namespace velt

#endif
