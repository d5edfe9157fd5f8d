// Many connections, most of which only wait.
#include "host/base/open_file_limit.h"
#include "tests/load/load_service.h"
#include "tests/support/waiting.h"

#include <atomic>
#include <ctime>
#include <deque>
#include <iostream>
#include <thread>

namespace velt::test {
namespace {

using std::chrono::microseconds;
using std::chrono::milliseconds;

constexpr std::size_t streamsOfOne = 32; ///< the most that one token may have
constexpr std::size_t idleOfOne = 50;

/// How much longer than alone a thread takes now that sleeps and then computes for a few milliseconds.
class Sluggishness {
public:
    Sluggishness() : thread_([this] { measure(); }) {}
    ~Sluggishness() { stop(); }
    Sluggishness(const Sluggishness&) = delete;
    Sluggishness& operator=(const Sluggishness&) = delete;

    /// The worst so far.
    microseconds stop() {
        ended_ = true;
        if (thread_.joinable()) {
            thread_.join();
        }
        return worst_;
    }

private:
    static microseconds processorTime() {
        timespec time{};
        clock_gettime(CLOCK_THREAD_CPUTIME_ID, &time);
        return std::chrono::seconds(time.tv_sec) +
               std::chrono::duration_cast<microseconds>(std::chrono::nanoseconds(time.tv_nsec));
    }

    void measure() {
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

    std::atomic<bool> ended_{false};
    microseconds worst_{0};
    std::thread thread_;
};

class Connections : public LoadService {
protected:
    void SetUp() override {
        if (velt::host::makeRoomForConnections(2 * (idleCount + streamCount)) <
            2 * (idleCount + streamCount)) {
            GTEST_SKIP() << "the test needs more descriptors";
        }
        hostArguments = {"--max-connections", std::to_string(idleCount + streamCount + 100), "--idle-seconds",
                         "600"};
        LoadService::SetUp();
    }

    /// Streams of events, of as many principals as they need, and connections that have asked once.
    void open() {
        for (std::size_t i = 0; i < streamCount; ++i) {
            if (i % streamsOfOne == 0) {
                token_ =
                    "Authorization: Bearer " + makeToken("reader-" + std::to_string(i), "viewer") + "\r\n";
            }
            streams_.push_back(Client::tcp(static_cast<unsigned short>(tcpPort)));
            streams_.back().send(requestText("GET", "/events", token_));
            ASSERT_NE(streams_.back().readUntil(": connected\n\n"), "") << i;
        }
        for (std::size_t i = 0; i < idleCount; ++i) {
            if (i % idleOfOne == 0) {
                token_ = "Authorization: Bearer " + makeToken("idle-" + std::to_string(i), "viewer") + "\r\n";
            }
            idle_.push_back(Client::tcp(static_cast<unsigned short>(tcpPort)));
            ASSERT_EQ(idle_.back().ask(requestText("GET", "/healthz", token_)).status, 200) << i;
        }
    }

    /// Asks once, over a new connection.
    static void askOnce(const std::string& path, Durations& durations) {
        const auto began = Clock::now();
        Client root = asRoot();
        EXPECT_EQ(root.ask(requestText("GET", path)).status, 200);
        durations.add(std::chrono::duration_cast<microseconds>(Clock::now() - began));
    }

    static Durations ask(const std::string& path, int count) {
        Durations durations;
        for (int i = 0; i < count; ++i) {
            askOnce(path, durations);
        }
        return durations;
    }

    /// Several threads take part in an answer, and each may be late by so much.
    static void expectWithin(const Durations& durations, milliseconds promised, microseconds late) {
        if (isLong()) {
            EXPECT_LT(durations.worst(), promised + 3 * late);
        }
    }

    std::size_t idleCount = inLongForm(2000UL, 200UL);
    std::size_t streamCount = inLongForm(1000UL, 100UL);
    std::deque<Client> streams_;
    std::deque<Client> idle_;
    std::string token_;
};

TEST_F(Connections, InGreatNumberDelayNeitherRootNorTheSignOfLife) {
    const int count = inLongForm(1000, 100);
    const std::string row = std::string(ftpApi) + "get";
    std::cout << "alone: root " << ask(row, count).text() << "; liveness " << ask("/healthz", count).text()
              << '\n';
    open();
    Sluggishness quiet;
    const Durations root = ask(row, count);
    const Durations liveness = ask("/healthz", count);
    const microseconds late = quiet.stop();
    std::cout << idleCount << " idle, " << streamCount << " streams: root " << root.text() << "; liveness "
              << liveness.text() << "; the machine was late by " << late.count() << " us at worst\n";
    expectWithin(root, milliseconds(100), late);
    expectWithin(liveness, milliseconds(20), late);
}

TEST_F(Connections, GetEachEventAndDelayNothingThen) {
    open();
    std::atomic<bool> ended{false};
    std::thread switcher([&ended] {
        Client root = asRoot();
        for (int i = 0; i < inLongForm(40, 4); ++i) {
            const std::string value = i % 2 == 0 ? "false" : "true";
            EXPECT_EQ(
                post(root, std::string(ftpApi) + "set", R"({"enable_ftps":false,"enable_ftp":)" + value + "}")
                    .status,
                204);
        }
        ended = true;
    });
    Sluggishness busy;
    Durations root;
    Durations liveness;
    while (!ended) {
        askOnce("/api/tokens", root);
        askOnce("/healthz", liveness);
    }
    const microseconds late = busy.stop();
    switcher.join();
    std::cout << "with events: root " << root.text() << "; liveness " << liveness.text()
              << "; the machine was late by " << late.count() << " us at worst\n";
    expectWithin(root, milliseconds(100), late);
    expectWithin(liveness, milliseconds(20), late);
    for (Client& stream : streams_) {
        ASSERT_NE(stream.readUntil("event: service\n"), "");
    }
}

} // namespace
} // namespace velt::test
