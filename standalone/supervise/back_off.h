// How long a supervisor waits before it starts its daemon again.
#ifndef VELT_STANDALONE_SUPERVISE_BACK_OFF_H
#define VELT_STANDALONE_SUPERVISE_BACK_OFF_H

#include <algorithm>
#include <chrono>

namespace velt {

/// Twice as long after each end, up to a longest time, and as at first after a run that was no part of a loop
/// of crashes.
class BackOff {
public:
    static constexpr std::chrono::milliseconds shortest{100};
    static constexpr std::chrono::milliseconds longest{30000};
    static constexpr std::chrono::milliseconds steadyRun{10000};

    /// How long to wait after a run that lasted this long; 0 for a start that failed.
    std::chrono::milliseconds after(std::chrono::nanoseconds run) {
        if (run >= steadyRun) {
            forget();
        }
        const auto wait = next_;
        next_ = std::min(next_ * 2, longest);
        return wait;
    }

    /// Somebody asked for a start.
    void forget() { next_ = shortest; }

private:
    std::chrono::milliseconds next_ = shortest;
};

} // namespace velt

#endif
