// The files that keep the system events: "/var/log/velt/events.jsonl" below the state root, and beside it the
// older ones, "events.jsonl.1" to "events.jsonl.4", the last of which are the oldest.
#ifndef VELT_STANDALONE_JOURNAL_EVENT_FILE_H
#define VELT_STANDALONE_JOURNAL_EVENT_FILE_H

#include "base/result.h"
#include "standalone/journal/system_event.h"

#include <cstddef>
#include <string>

namespace velt {

/// The event as one JSON object in one line of ASCII, without the line's end. Bytes that are not UTF-8 become
/// U+FFFD.
std::string renderEvent(const SystemEvent& event);

/// The newest file is put among the older ones before it would grow beyond this.
inline constexpr std::size_t largestEventFile = 4UL * 1024 * 1024;
inline constexpr int keptEventFiles = 4;

/// Appends the event's line. Lines of several processes never mix, the file may be renamed away at any time,
/// and a process that is killed at any moment leaves whole lines, of which none but the oldest file's are
/// gone. A line of more than 64 KiB is refused.
Result<> appendEvent(const SystemEvent& event);

} // namespace velt

#endif
