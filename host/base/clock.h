// Times as clients write them, UTC.
#ifndef VELT_HOST_BASE_CLOCK_H
#define VELT_HOST_BASE_CLOCK_H

#include "base/utc_text.h"

#include <optional>
#include <string>

namespace velt::host {

/// Reads "2026-11-21", "2026-11-21T06:30:00Z", the latter with up to three decimals, or seconds since 1970.
/// A time that the clock cannot hold becomes the nearest that it can.
std::optional<TimePoint> parseTimestamp(const std::string& text);

} // namespace velt::host

#endif
