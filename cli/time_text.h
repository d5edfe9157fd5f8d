// Times as the server reads and people write them.
#ifndef VELT_CLI_TIME_TEXT_H
#define VELT_CLI_TIME_TEXT_H

#include <cstdint>
#include <ctime>
#include <optional>
#include <string>

namespace velt::cli {

/// "2026-11-21T08:00:00Z" for seconds since 1970.
std::string utcText(std::time_t time);

/// A point in time from "30s", "15m", "2h" or "7d" (that long before `now`). A text that starts with a date
/// ("2026-11-21", "2026-11-21T08:00:00Z") stays as it is. Nothing for any other text.
std::optional<std::string> parseSince(const std::string& text, std::time_t now);

/// "3 d 4 h", "5 h 10 min", "12 min 3 s" or "8 s".
std::string durationText(std::int64_t seconds);

} // namespace velt::cli

#endif
