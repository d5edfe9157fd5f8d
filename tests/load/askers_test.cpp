// Clients that ask without pause.
#include "tests/load/delays.h"
#include "tests/load/load_service.h"
#include "tests/support/waiting.h"

#include <poll.h>

#include <algorithm>
#include <atomic>
#include <iostream>
#include <thread>
#include <vector>

namespace velt::test {
namespace {

using std::chrono::milliseconds;

constexpr std::size_t connectionsOfOne = 240; ///< one token may have 250

/// Connections that ask for the same again as soon as they have the answer.
class Askers {
public:
    Askers(int port, const std::vector<std::string>& requests) {
        for (std::size_t i = 0; i < connectionsOfOne; ++i) {
            clients_.push_back(Client::tcp(static_cast<unsigned short>(port)));
            requests_.push_back(requests[i % requests.size()]);
        }
        thread_ = std::thread([this] { run(); });
    }
    ~Askers() { stop(); }
    Askers(const Askers&) = delete;
    Askers& operator=(const Askers&) = delete;

    /// How many answers they have got so far.
    std::size_t answers() const { return answers_; }

    /// How many of them had another status than 200.
    std::size_t stop() {
        ended_ = true;
        if (thread_.joinable()) {
            thread_.join();
        }
        return refused_;
    }

private:
    void run() {
        std::vector<pollfd> waiting;
        for (std::size_t i = 0; i < clients_.size(); ++i) {
            clients_[i].send(requests_[i]);
            waiting.push_back({clients_[i].descriptor(), POLLIN, 0});
        }
        while (!ended_) {
            poll(waiting.data(), waiting.size(), 100);
            for (std::size_t i = 0; i < clients_.size(); ++i) {
                if (waiting[i].revents != 0) {
                    refused_ += clients_[i].receive().status != 200;
                    ++answers_;
                    clients_[i].send(requests_[i]);
                }
            }
        }
    }

    std::vector<Client> clients_;
    std::vector<std::string> requests_;
    std::atomic<std::size_t> answers_{0};
    std::size_t refused_ = 0;
    std::atomic<bool> ended_{false};
    std::thread thread_;
};

class AskersOfOneToken : public LoadService {
protected:
    /// Asks as root while a viewer asks for these without pause.
    void measure(const std::vector<std::string>& paths) {
        const int count = inLongForm(1000, 100);
        std::cout << "alone: root " << ask(row, count).text() << "; liveness "
                  << ask("/healthz", count).text() << '\n';
        Askers askers(tcpPort, requestsFor(paths));
        ASSERT_TRUE(waitUntil([&askers] { return askers.answers() > connectionsOfOne; }, patience));
        Durations root;
        Durations liveness;
        std::vector<std::size_t> meanwhile; // the answers that the viewer got while root waited
        Sluggishness busy;
        for (int i = 0; i < count; ++i) {
            const std::size_t before = askers.answers();
            askOnce(row, root);
            meanwhile.push_back(askers.answers() - before);
            askOnce("/healthz", liveness);
        }
        const auto late = busy.stop();
        EXPECT_EQ(askers.stop(), 0U);
        std::ranges::sort(meanwhile);
        const std::size_t usual = meanwhile[meanwhile.size() / 2];
        std::cout << connectionsOfOne << " connections that ask: root " << root.text() << "; liveness "
                  << liveness.text() << "; " << usual << " answers to the viewer before root's, of "
                  << askers.answers() << "; the machine was late by " << late.count() << " us at worst\n";
        EXPECT_LT(usual, connectionsOfOne / 4) << "root waits for all that the viewer has asked";
        expectWithin(root, milliseconds(100), late);
        expectWithin(liveness, milliseconds(20), late);
    }

private:
    std::vector<std::string> requestsFor(const std::vector<std::string>& paths) const {
        const std::string token = "Authorization: Bearer " + makeToken("viewer", "viewer") + "\r\n";
        std::vector<std::string> requests;
        for (const std::string& path : paths) {
            requests.push_back(requestText("GET", path, token));
        }
        return requests;
    }

    const std::string row = std::string(ftpApi) + "get";
};

TEST_F(AskersOfOneToken, DelayNobodyElse) {
    measure({"/metrics", "/api/settings"});
}

TEST_F(AskersOfOneToken, DelayNobodyElseWithWhatIsAnsweredAtOnce) {
    measure({"/openapi.json"});
}

} // namespace
} // namespace velt::test
