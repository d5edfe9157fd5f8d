// Reads side by side, writes alone: with many clients, and of the order itself.

#include "host/module/request_order.h"
#include "tests/host/fake_standalone.h"
#include "tests/host/host_test.h"
#include "tests/support/fake_platform/fake_platform.h"
#include "tests/support/waiting.h"

#include <poll.h>

#include <algorithm>
#include <atomic>
#include <fstream>
#include <future>
#include <thread>

namespace {

using std::chrono::milliseconds;
using std::chrono::seconds;
using velt::host::RequestOrder;
using Kind = RequestOrder::Kind;

class HostOrder : public HostTest {
protected:
    void SetUp() override {
        fake::Platform::instance().reset();
        FakeStandalone::instance() = {};
        modules = {COUNTING_MODULE};
    }

    /// The number of requests that got the wanted status, of `count` over one connection.
    int repeat(const std::string& method, int count, int status) const {
        Client client = connect();
        int good = 0;
        for (int i = 0; i < count; ++i) {
            good +=
                client.ask(requestText("POST", "/api/VELT.Test.Order/v1/" + method, admin)).status == status;
        }
        return good;
    }

    /// A call that lasts until letGo().
    std::string callThatLasts(const std::string& method) const { return callThatLasts(method, admin); }
    std::string callThatLasts(const std::string& method, const std::string& headers) const {
        return requestText("POST", "/api/VELT.Test.Order/v1/" + method, headers,
                           R"({"folder":")" + folder.string() + "\"}");
    }

    /// Waits until so many of these calls run.
    ::testing::AssertionResult running(int count) const {
        const auto begun = [this] {
            return std::ranges::count_if(std::filesystem::directory_iterator(folder), [](const auto& entry) {
                return entry.path().filename().string().starts_with("begun-");
            });
        };
        return velt::test::waitUntil([&] { return begun() == count; }, seconds(20))
                   ? ::testing::AssertionSuccess()
                   : ::testing::AssertionFailure() << begun() << " run";
    }

    void letGo() const { std::ofstream(folder / "go"); }

    /// Whether there is something to receive, by now.
    static bool isAnswered(const Client& client) {
        pollfd waiting{client.descriptor(), POLLIN, 0};
        return poll(&waiting, 1, 0) == 1;
    }
};

TEST_F(HostOrder, TwoWritersAndManyReaders) {
    start();
    std::atomic<int> good{0};
    std::vector<std::thread> clients;
    clients.reserve(10);
    for (int i = 0; i < 2; ++i) {
        clients.emplace_back([&] { good += repeat("set", 40, 204); });
    }
    for (int i = 0; i < 8; ++i) {
        clients.emplace_back([&] { good += repeat("get", 40, 200); });
    }
    for (std::thread& client : clients) {
        client.join();
    }
    EXPECT_EQ(good, 400);
    const Json::Value seen = get("/api/VELT.Test.Order/v1/get").json();
    EXPECT_EQ(seen["value"], 80);
    EXPECT_EQ(seen["writers"], 1);
    EXPECT_GT(seen["readers"].asInt(), 1);
    EXPECT_EQ(seen["torn"], false);
    EXPECT_EQ(seen["mixed"], false);
}

TEST_F(HostOrder, ALongWriteDelaysNothingButTheModule) {
    start();
    Client writer = connect();
    writer.send(callThatLasts("wait"));
    ASSERT_TRUE(running(1));
    for (int i = 0; i < 20; ++i) {
        EXPECT_EQ(get("/healthz").status, 200);
    }
    EXPECT_FALSE(isAnswered(writer)) << "it lasted all the time";
    letGo();
    EXPECT_EQ(writer.receive().status, 204);
}

TEST_F(HostOrder, ModulesThatBlockAllTheirThreadsDelayNothingElse) {
    settings.workers = 2;
    start();
    std::vector<Client> readers;
    for (int i = 0; i < 4; ++i) {
        readers.push_back(connect());
        readers.back().send(callThatLasts("get_wait"));
    }
    ASSERT_TRUE(running(2));
    for (const char* target : {"/healthz", "/api", "/api/log", "/api/tokens", "/openapi.json"}) {
        EXPECT_EQ(get(target).status, 200) << target;
    }
    EXPECT_TRUE(std::ranges::none_of(readers, isAnswered)) << "all threads were blocked all the time";
    letGo();
    for (Client& reader : readers) {
        EXPECT_EQ(reader.receive().status, 204);
    }
}

TEST_F(HostOrder, AStopFinishesWhatRuns) {
    start();
    Client client = connect();
    client.send(callThatLasts("wait"));
    ASSERT_TRUE(running(1));
    Client idle = connect();
    EXPECT_EQ(idle.ask(requestText("GET", "/healthz", admin)).status, 200);
    std::thread stopper([this] { stop(); });
    EXPECT_TRUE(idle.ended()) << "the stop has begun";
    letGo();
    const Answer answer = client.receive();
    EXPECT_EQ(answer.status, 204);
    EXPECT_EQ(answer.header("connection"), "close");
    stopper.join();
}

TEST_F(HostOrder, TooManyWaitingRequestsAreTurnedAway) {
    settings.workers = 1;
    settings.maxWaiting = 2;
    start();
    std::vector<Client> clients;
    for (int i = 0; i < 5; ++i) {
        clients.push_back(connect());
        clients.back().send(callThatLasts("wait"));
        ASSERT_TRUE(running(1));
    }
    EXPECT_TRUE(
        velt::test::waitUntil([&] { return std::ranges::count_if(clients, isAnswered) == 2; }, seconds(20)))
        << "one runs and two wait";
    letGo();
    int refused = 0;
    for (Client& client : clients) {
        const Answer answer = client.receive();
        refused += answer.status == 503;
        EXPECT_TRUE(answer.status == 204 || (answer.status == 503 && answer.header("retry-after") == "5"));
    }
    EXPECT_EQ(refused, 2);
}

TEST_F(HostOrder, OneTokenThatHasTooManyWaitingTurnsNobodyElseAway) {
    settings.workers = 1;
    settings.maxWaiting = 2;
    start();
    std::vector<Client> clients;
    const auto oneIsRefused = [&clients] {
        return velt::test::waitUntil([&] { return std::ranges::count_if(clients, isAnswered) == 1; },
                                     seconds(20));
    };
    for (int i = 0; i < 4; ++i) {
        clients.push_back(connect());
        clients.back().send(callThatLasts("get_wait", viewer));
        ASSERT_TRUE(running(1));
    }
    EXPECT_TRUE(oneIsRefused()) << "one runs and two wait";
    clients.clear();
    for (int i = 0; i < 3; ++i) {
        clients.push_back(Client::unixSocket(socketPath));
        clients.back().send(callThatLasts("get_wait", ""));
    }
    EXPECT_TRUE(oneIsRefused()) << "two of root's wait";
    letGo();
    EXPECT_EQ(std::ranges::count_if(clients, [](Client& each) { return each.receive().status == 204; }), 2);
}

TEST(RequestOrder, WhatWaitsHoldsALimitedNumberOfBytes) {
    RequestOrder order(1, 100, 1000);
    std::promise<void> started;
    std::promise<void> release;
    ASSERT_TRUE(order.submit(
        Kind::write, "one",
        [&] {
            started.set_value();
            release.get_future().wait();
        },
        1000));
    started.get_future().wait();
    EXPECT_TRUE(order.submit(
        Kind::read, "one", [] {}, 600))
        << "the one that runs does not wait";
    EXPECT_FALSE(order.submit(
        Kind::read, "one", [] {}, 401));
    EXPECT_TRUE(order.submit(
        Kind::read, "one", [] {}, 400));
    EXPECT_TRUE(order.submit(Kind::read, "one", [] {}));
    std::promise<void> last;
    EXPECT_TRUE(order.submit(Kind::write, "one", [&] { last.set_value(); }));
    release.set_value();
    last.get_future().wait();
    EXPECT_TRUE(order.submit(
        Kind::read, "one", [] {}, 1000));
}

TEST(RequestOrder, AReadThatComesAfterAWaitingWriteWaitsForIt) {
    RequestOrder order(4, 100, 0);
    std::promise<void> release;
    std::mutex mutex;
    std::string sequence;
    const auto note = [&](char name) {
        const std::lock_guard lock(mutex);
        sequence += name;
    };
    std::promise<void> begun;
    ASSERT_TRUE(order.submit(Kind::read, "one", [&] {
        begun.set_value();
        release.get_future().wait();
        note('1');
    }));
    begun.get_future().wait();
    ASSERT_TRUE(order.submit(Kind::write, "one", [&] { note('W'); }));
    ASSERT_TRUE(order.submit(Kind::read, "one", [&] { note('2'); }));
    std::promise<void> beside;
    ASSERT_TRUE(order.submit(Kind::unordered, "one", [&] { beside.set_value(); }));
    beside.get_future().wait();
    release.set_value();
    order.stop();
    EXPECT_EQ(sequence, "1W2");
}

TEST(RequestOrder, SearchesDelayNothingElse) {
    RequestOrder order(1, 100, 0);
    std::promise<void> release;
    const std::shared_future<void> released = release.get_future().share();
    std::atomic<int> running{0};
    std::atomic<int> most{0};
    for (int i = 0; i < 10; ++i) {
        ASSERT_TRUE(order.submit(Kind::search, "one", [&, released] {
            most = std::max<int>(most, ++running);
            released.wait();
            --running;
        }));
    }
    std::promise<void> unordered;
    std::promise<void> ordered;
    ASSERT_TRUE(order.submit(Kind::unordered, "one", [&] { unordered.set_value(); }));
    ASSERT_TRUE(order.submit(Kind::write, "one", [&] { ordered.set_value(); }));
    EXPECT_EQ(unordered.get_future().wait_for(seconds(10)), std::future_status::ready);
    EXPECT_EQ(ordered.get_future().wait_for(seconds(10)), std::future_status::ready);
    release.set_value();
    order.stop();
    EXPECT_EQ(most, 1);
}

TEST(RequestOrder, AStopFinishesWhatWaitsAndTakesNoMore) {
    RequestOrder order(2, 100, 0);
    std::atomic<int> done{0};
    for (int i = 0; i < 20; ++i) {
        EXPECT_TRUE(order.submit(i % 2 == 0 ? Kind::write : Kind::read, "one", [&] {
            std::this_thread::sleep_for(milliseconds(1));
            ++done;
        }));
    }
    order.stop();
    EXPECT_EQ(done, 20);
    EXPECT_FALSE(order.submit(Kind::read, "one", [] {}));
}

} // namespace
