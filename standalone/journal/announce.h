// Announcing what happened on the server.
#ifndef VELT_STANDALONE_JOURNAL_ANNOUNCE_H
#define VELT_STANDALONE_JOURNAL_ANNOUNCE_H

#include "base/result.h"
#include "standalone/journal/system_event.h"

#include <map>
#include <string>

namespace velt {

/// Writes down the system event "velt.service.action", on behalf of the calling thread's actor, and tells the
/// subscribers. They hear of it even when it cannot be written. Thread-safe.
Result<> announce(const std::string& name, const std::map<std::string, std::string>& parameters);

/// The same for an event that was made before, as it is.
Result<> announce(const SystemEvent& event);

} // namespace velt

#endif
