#ifndef VELT_TESTS_SUPPORT_WAITING_H
#define VELT_TESTS_SUPPORT_WAITING_H

#include <chrono>
#include <concepts>
#include <functional>

namespace velt::test {

using Clock = std::chrono::steady_clock;

/// For what comes at once unless it never comes: only a test that fails waits that long.
inline constexpr std::chrono::seconds patience{30};

double secondsSince(Clock::time_point start);

/// How long the work takes.
template<std::invocable Work> std::chrono::milliseconds timeOf(const Work& work) {
    const auto began = Clock::now();
    work();
    return std::chrono::ceil<std::chrono::milliseconds>(Clock::now() - began);
}

/// Whether the condition came true within this time.
bool waitUntil(const std::function<bool()>& condition, std::chrono::milliseconds limit);

} // namespace velt::test

#endif
