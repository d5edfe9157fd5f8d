// An event that goes out to very many clients, and requests that come meanwhile.

#include "host/http/server.h"
#include "host/http/turns.h"
#include "tests/host/client.h"

#include <gtest/gtest.h>

#include <sys/ioctl.h>

#include <boost/asio/post.hpp>

#include <algorithm>
#include <future>
#include <memory>
#include <numeric>
#include <string>
#include <vector>

namespace velt::host {
namespace {

TEST(Turns, KeepTheOrderAndLetOthersIn) {
    constexpr int count = 100;
    boost::asio::io_context context;
    Turns turns(context);
    std::vector<int> done;
    std::size_t doneBefore = 0;
    for (int i = 0; i < count; ++i) {
        turns.add([&done, i] { done.push_back(i); });
    }
    boost::asio::post(context, [&] { doneBefore = done.size(); });
    context.run();
    EXPECT_GT(doneBefore, 0U);
    EXPECT_LT(doneBefore, 50U);
    std::vector<int> all(count);
    std::iota(all.begin(), all.end(), 0);
    EXPECT_EQ(done, all);
    turns.add([&done] { done.clear(); });
    context.restart();
    context.run();
    EXPECT_TRUE(done.empty()) << "what comes after the end of a turn begins the next";
}

TEST(Turns, TakeWorkThatTheirOwnWorkAdds) {
    boost::asio::io_context context;
    Turns turns(context);
    int left = 40;
    std::function<void()> goOn = [&] {
        if (--left > 0) {
            turns.add(goOn);
        }
    };
    turns.add(goOn);
    context.run();
    EXPECT_EQ(left, 0);
}

/// Lets everybody in. A request for "/hold" keeps the server's thread until it is released; one for "/probe"
/// is told to the test.
class Door : public HttpHandler {
public:
    std::optional<Refusal> checkAccess(const HttpRequest& head, const Peer&, Principal&) override {
        if (head.target == "/hold") {
            held.set_value();
            released.get_future().wait();
        } else if (head.target == "/probe") {
            onProbe();
        }
        return std::nullopt;
    }
    std::size_t bodyLimit(const HttpRequest&, const Principal&) const override { return 0; }
    bool asksForEvents(const HttpRequest& request) const override { return request.target == "/events"; }
    void handle(HttpRequest, const Principal&, Done done) override { done({}); }
    HttpResponse failure(int status, const std::string&) override { return {status, "", "", {}}; }
    void addEventReader(const std::shared_ptr<EventReader>& reader, const HttpRequest&,
                        const Principal&) override {
        readers.push_back(reader);
    }

    std::promise<void> held;
    std::promise<void> released;
    std::function<void()> onProbe;
    std::vector<std::weak_ptr<EventReader>>
        readers; ///< used by the server's only thread while it is not held
};

class EventsForMany : public testing::Test {
protected:
    static constexpr int streamCount = 100;

    void SetUp() override {
        Listener listener = Listener::tcp("127.0.0.1:0", false);
        port_ = listener.port();
        server_.add(std::move(listener));
        server_.start(1);
        for (int i = 0; i < streamCount; ++i) {
            streams_.push_back(Client::tcp(port_));
            streams_.back().send(requestText("GET", "/events"));
            ASSERT_NE(streams_.back().readUntil(": connected\n\n"), "");
        }
    }

    void deliver(const std::string& event) {
        const auto text = std::make_shared<const std::string>(event);
        for (const auto& reader : door_.readers) {
            reader.lock()->deliver(text);
        }
    }

    /// How many clients have something to read.
    long reached() const {
        return std::ranges::count_if(streams_, [](const Client& stream) {
            int waiting = 0;
            return ::ioctl(stream.descriptor(), FIONREAD, &waiting) == 0 && waiting > 0;
        });
    }

    Door door_;
    HttpServer server_{door_, {}, {}};
    unsigned short port_ = 0;
    std::vector<Client> streams_;
};

TEST_F(EventsForMany, LetARequestInBeforeAllHaveThem) {
    long reachedBefore = -1;
    door_.onProbe = [&] { reachedBefore = reached(); };
    Client holder = Client::tcp(port_);
    holder.send(requestText("GET", "/hold"));
    door_.held.get_future().wait();
    deliver("event: one\n\n");
    deliver("event: two\n\n");
    Client probe = Client::tcp(port_);
    probe.send(requestText("GET", "/probe"));
    door_.released.set_value();
    EXPECT_EQ(probe.receive().status, 200);
    EXPECT_GE(reachedBefore, 0);
    EXPECT_LT(reachedBefore, streamCount);
    for (Client& stream : streams_) {
        EXPECT_EQ(stream.readUntil("two\n\n"), "event: one\n\nevent: two\n\n");
    }
}

} // namespace
} // namespace velt::host
