// An entry of the administrator log.
#ifndef VELT_STANDALONE_JOURNAL_LOG_ENTRY_H
#define VELT_STANDALONE_JOURNAL_LOG_ENTRY_H

#include <array>
#include <chrono>
#include <cstdint>
#include <optional>
#include <string>

namespace velt {

/// An entry of the administrator log, as it was written.
struct LogEntry {
    std::int64_t id = 0;                        ///< grows with each entry; none is used twice
    std::chrono::system_clock::time_point time; ///< in whole milliseconds
    int category = 0;
    int level = 0;
    unsigned event = 0;               ///< 0x11B000nn, or 0x11BF00nn of this system itself
    std::array<std::string, 4> texts; ///< "" for those that the event does not use
    std::string sentence;             ///< the event's sentence with the texts filled in
    std::string actor;                ///< "" for the system itself
    std::string address;
};

/// Which entries of the administrator log are wanted; a field that is not set excludes nothing.
struct LogFilter {
    std::optional<std::chrono::system_clock::time_point> since; ///< of this moment or later
    std::optional<unsigned> event;
    std::optional<std::string> actor;     ///< exactly this text
    std::optional<std::int64_t> beforeId; ///< older than this entry: the last id of a page leads to the next
    int limit = 100;                      ///< 1 to 1000
};

} // namespace velt

#endif
