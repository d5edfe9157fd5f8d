// Times of UTC as text.
#ifndef VELT_BASE_UTC_TEXT_H
#define VELT_BASE_UTC_TEXT_H

#include <chrono>
#include <string>

namespace velt {

using TimePoint = std::chrono::system_clock::time_point;

/// As strftime(3) writes it.
std::string utcText(TimePoint time, const char* format);

/// "2026-11-21T06:30:00.123Z"
std::string timestamp(TimePoint time = std::chrono::system_clock::now());

} // namespace velt

#endif
