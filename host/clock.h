// Moments as text, UTC.
#ifndef VELT_HOST_CLOCK_H
#define VELT_HOST_CLOCK_H

#include <cstdint>
#include <optional>
#include <string>

namespace velt::host {

/// Milliseconds since 1970.
std::int64_t nowMilliseconds();

/// "2026-11-21T06:30:00.123Z", of now or of the given moment.
std::string timestamp();
std::string timestamp(std::int64_t milliseconds);

/// Reads "2026-11-21", "2026-11-21T06:30:00Z", the same with up to three decimals, or plain seconds since
/// 1970.
std::optional<std::int64_t> parseTimestamp(const std::string& text);

/// "Sat, 21 Nov 2026 06:30:00 GMT", as HTTP wants it.
std::string httpDate();

} // namespace velt::host

#endif
