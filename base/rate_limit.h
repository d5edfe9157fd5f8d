// How often something may happen that others can cause as often as they like.
#ifndef VELT_BASE_RATE_LIMIT_H
#define VELT_BASE_RATE_LIMIT_H

#include <chrono>
#include <cstddef>
#include <optional>
#include <utility>

namespace velt {

/// For one thread, or under a lock.
class RateLimit {
public:
    using Clock = std::chrono::steady_clock;

    /// So many times within each period, which begins with the first after the former one.
    RateLimit(std::size_t most, Clock::duration period) : most_(most), period_(period) {}

    /// How many times were refused since the last that was not; nothing when this one is refused, too.
    std::optional<std::size_t> admit(Clock::time_point now = Clock::now()) {
        if (!began_ || now - *began_ >= period_) {
            began_ = now;
            admitted_ = 0;
        }
        if (admitted_ == most_) {
            ++refused_;
            return std::nullopt;
        }
        ++admitted_;
        return std::exchange(refused_, 0);
    }

private:
    std::size_t most_;
    Clock::duration period_;
    std::optional<Clock::time_point> began_; ///< of the period that runs
    std::size_t admitted_ = 0;               ///< in it
    std::size_t refused_ = 0;
};

} // namespace velt

#endif
