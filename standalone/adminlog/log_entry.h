// One entry of the administrator log.
#ifndef VELT_STANDALONE_ADMINLOG_LOG_ENTRY_H
#define VELT_STANDALONE_ADMINLOG_LOG_ENTRY_H

#include <array>
#include <chrono>
#include <cstdint>
#include <string>

namespace velt {

using LogTime = std::chrono::sys_time<std::chrono::milliseconds>;

/// All texts are plain UTF-8 of one line.
struct LogEntry {
    std::int64_t id = 0; ///< grows with each entry, never used twice
    LogTime time;        ///< UTC
    int category = 0;
    int level = 0;
    std::uint32_t event = 0;
    std::array<std::string, 4> texts;
    std::string sentence; ///< the catalogue's, filled with the texts
    std::string actor;    ///< who asked for it; "" when that is not known
    std::string address;  ///< where the request came from; "" when that is not known
};

} // namespace velt

#endif
