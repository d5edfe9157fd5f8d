// Many connections, most of which only wait.
#include "host/base/open_file_limit.h"
#include "tests/load/delays.h"
#include "tests/load/load_service.h"

#include <atomic>
#include <deque>
#include <iostream>
#include <thread>

namespace velt::test {
namespace {

using std::chrono::milliseconds;

constexpr std::size_t streamsOfOne = 32; ///< the most that one token may have
constexpr std::size_t idleOfOne = 50;

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
    const auto late = quiet.stop();
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
    const auto late = busy.stop();
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
