#ifndef VELT_TESTS_SUPPORT_WAITING_H
#define VELT_TESTS_SUPPORT_WAITING_H

#include <chrono>
#include <functional>

namespace velt::test {

using Clock = std::chrono::steady_clock;

double secondsSince(Clock::time_point start);

/// Whether the condition came true within this time.
bool waitUntil(const std::function<bool()>& condition, std::chrono::milliseconds limit);

} // namespace velt::test

#endif
