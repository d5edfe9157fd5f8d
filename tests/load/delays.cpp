#include "tests/load/delays.h"

#include "tests/host/client.h"
#include "tests/load/load_service.h"
#include "tests/support/waiting.h"

#include <algorithm>
#include <ctime>
#include <sstream>

namespace velt::test {

using std::chrono::microseconds;
using std::chrono::milliseconds;

namespace {

std::string inMilliseconds(std::chrono::microseconds duration) {
    std::ostringstream text;
    text.precision(1);
    text << std::fixed << static_cast<double>(duration.count()) / 1000 << " ms";
    return text.str();
}

microseconds processorTime() {
    timespec time{};
    clock_gettime(CLOCK_THREAD_CPUTIME_ID, &time);
    return std::chrono::seconds(time.tv_sec) +
           std::chrono::duration_cast<microseconds>(std::chrono::nanoseconds(time.tv_nsec));
}

} // namespace

std::chrono::microseconds Durations::percentile(unsigned percent) const {
    std::vector<std::chrono::microseconds> sorted = all_;
    std::ranges::sort(sorted);
    return sorted.empty() ? std::chrono::microseconds(0) : sorted[(sorted.size() - 1) * percent / 100];
}

std::string Durations::text() const {
    return "worst " + inMilliseconds(worst()) + ", 99 % within " + inMilliseconds(percentile(99)) +
           ", half within " + inMilliseconds(percentile(50)) + ", of " + std::to_string(all_.size());
}

microseconds Sluggishness::stop() {
    ended_ = true;
    if (thread_.joinable()) {
        thread_.join();
    }
    return worst_;
}

void Sluggishness::measure() {
    constexpr milliseconds nap(20);
    constexpr milliseconds work(3);
    while (!ended_) {
        const auto began = Clock::now();
        std::this_thread::sleep_for(nap);
        const auto done = processorTime() + work;
        while (processorTime() < done) {
        }
        const auto taken = std::chrono::duration_cast<microseconds>(Clock::now() - began);
        worst_ = std::max(worst_, taken - nap - work);
    }
}

void askOnce(const std::string& path, Durations& durations) {
    const auto began = Clock::now();
    Client root = LoadService::asRoot();
    EXPECT_EQ(root.ask(requestText("GET", path)).status, 200);
    durations.add(std::chrono::duration_cast<microseconds>(Clock::now() - began));
}

Durations ask(const std::string& path, int count) {
    Durations durations;
    for (int i = 0; i < count; ++i) {
        askOnce(path, durations);
    }
    return durations;
}

void expectWithin(const Durations& durations, milliseconds promised, microseconds late) {
    if (isLong()) {
        EXPECT_LT(durations.worst(), promised + 3 * late);
    }
}

} // namespace velt::test
