// The file that keeps the system events: "/var/log/velt/events.jsonl" below the state root.
#ifndef VELT_STANDALONE_EVENTS_EVENT_FILE_H
#define VELT_STANDALONE_EVENTS_EVENT_FILE_H

#include "standalone/standalone.h"

#include <string>

namespace velt {

/// The event as one JSON object in one line of ASCII, without the line's end. Bytes that are no UTF-8 become
/// U+FFFD.
std::string renderEvent(const SystemEvent& event);

/// Appends the event's line. Lines of several processes never mix, and the file may be renamed away at any
/// time. Negative, with the last error set, when the line is longer than 64 KiB or cannot be written whole.
int appendEvent(const SystemEvent& event);

} // namespace velt

#endif
