// How long veltd takes to answer root while others keep it busy.
#ifndef VELT_TESTS_LOAD_DELAYS_H
#define VELT_TESTS_LOAD_DELAYS_H

#include <atomic>
#include <chrono>
#include <string>
#include <thread>
#include <vector>

namespace velt::test {

/// Durations, told by their percentiles.
class Durations {
public:
    void add(std::chrono::microseconds duration) { all_.push_back(duration); }
    std::chrono::microseconds worst() const { return percentile(100); }
    std::chrono::microseconds percentile(unsigned percent) const;
    /// "worst 3.1 ms, 99 % within 2.0 ms, half within 0.4 ms, of 1000"
    std::string text() const;

private:
    std::vector<std::chrono::microseconds> all_;
};

/// How much longer than alone a thread takes now that sleeps and then computes for a few milliseconds.
class Sluggishness {
public:
    Sluggishness() : thread_([this] { measure(); }) {}
    ~Sluggishness() { stop(); }
    Sluggishness(const Sluggishness&) = delete;
    Sluggishness& operator=(const Sluggishness&) = delete;

    /// The worst so far.
    std::chrono::microseconds stop();

private:
    void measure();

    std::atomic<bool> ended_{false};
    std::chrono::microseconds worst_{0};
    std::thread thread_;
};

/// Asks as root on the Unix socket, over a new connection.
void askOnce(const std::string& path, Durations& durations);
Durations ask(const std::string& path, int count);

/// In the long form of the tests. Several threads take part in an answer, and each may be late by so much.
void expectWithin(const Durations& durations, std::chrono::milliseconds promised,
                  std::chrono::microseconds late);

} // namespace velt::test

#endif
