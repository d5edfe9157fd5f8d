// Whatever the network asks, the Unix socket is served meanwhile.

#include "host/http/server.h"
#include "tests/host/client.h"
#include "tests/support/temporary_folder.h"

#include <gtest/gtest.h>

#include <future>
#include <string>

namespace velt::host {
namespace {

/// Keeps the thread that serves "/hold" until it is released.
class Holder : public HttpHandler {
public:
    std::optional<Refusal> checkAccess(const HttpRequest& head, const Peer&, Principal&) override {
        if (head.target == "/hold") {
            held.set_value();
            released.get_future().wait();
        }
        return std::nullopt;
    }
    std::size_t bodyLimit(const HttpRequest&, const Principal&) const override { return 0; }
    bool asksForEvents(const HttpRequest& request) const override { return request.target == "/events"; }
    void handle(HttpRequest, const Principal&, Done done) override { done({}); }
    HttpResponse failure(int status, const std::string&) override { return {status, "", "", {}}; }
    void addEventReader(const std::shared_ptr<EventReader>&, const HttpRequest&, const Principal&) override {}

    std::promise<void> held;
    std::promise<void> released;
};

TEST(HttpLanes, ServeTheUnixSocketWhileTheNetworkHasAllOtherThreads) {
    const test::TemporaryFolder folder;
    Holder holder;
    HttpServer server(holder, {}, {});
    Listener network = Listener::tcp("127.0.0.1:0", false);
    const unsigned short port = network.port();
    server.add(std::move(network));
    const std::string path = (folder.path() / "socket").string();
    server.add(Listener::unixSocket(path, ""));
    server.start(1);
    Client holding = Client::tcp(port);
    holding.send(requestText("GET", "/hold"));
    holder.held.get_future().wait();
    Client local = Client::unixSocket(path);
    for (int i = 0; i < 3; ++i) {
        EXPECT_EQ(local.ask(requestText("GET", "/")).status, 200);
    }
    Client events = Client::unixSocket(path);
    events.send(requestText("GET", "/events"));
    EXPECT_NE(events.readUntil(": connected\n\n"), "");
    holder.released.set_value();
    EXPECT_EQ(holding.receive().status, 200);
}

} // namespace
} // namespace velt::host
