// Times as text, UTC.
#ifndef VELT_HOST_BASE_CLOCK_H
#define VELT_HOST_BASE_CLOCK_H

#include <chrono>
#include <optional>
#include <string>

namespace velt::host {

using TimePoint = std::chrono::system_clock::time_point;

/// "2026-11-21T06:30:00.123Z"
std::string timestamp(TimePoint time = std::chrono::system_clock::now());

/// Reads "2026-11-21", "2026-11-21T06:30:00Z", the latter with up to three decimals, or seconds since 1970.
std::optional<TimePoint> parseTimestamp(const std::string& text);

/// "Sat, 21 Nov 2026 06:30:00 GMT", the form that HTTP uses.
std::string httpDate();

} // namespace velt::host

#endif
