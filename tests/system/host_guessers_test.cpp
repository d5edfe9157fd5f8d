// Guessing tokens while somebody changes settings, against the real veltd.
#include "base/unique_fd.h"
#include "tests/host/client.h"
#include "tests/support/waiting.h"
#include "tests/system/support/host_service.h"

#include <arpa/inet.h>
#include <fcntl.h>
#include <netinet/in.h>
#include <sys/file.h>
#include <sys/socket.h>

#include <vector>

namespace velt::test {
namespace {

/// Clients elsewhere: loopback is never banned, and these are no loopback addresses, although they are of
/// this machine.
const std::string guesser = "192.0.2.66";
const std::string other = "192.0.2.67";

const std::string wrongToken = "Authorization: Bearer wrong\r\n";

class TokenGuessing : public HostService {
protected:
    void SetUp() override {
        HostService::SetUp();
        if (IsSkipped() || HasFatalFailure()) {
            return;
        }
        for (const std::string& address : {guesser, other}) {
            runProcess({"ip", "address", "add", address + "/32", "dev", "lo"});
        }
        writeFile(worldRoot / "etc/velt/bans.conf", "version = 1\nfailures = 3\nban_seconds = 600\n");
    }

    void TearDown() override {
        HostService::TearDown();
        for (const std::string& address : {guesser, other}) {
            runProcess({"ip", "address", "delete", address + "/32", "dev", "lo"});
        }
    }

    /// A connection to veltd from this address.
    Client connectFrom(const std::string& from) const {
        const int descriptor = socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0);
        const auto name = [](const std::string& address, int number) {
            sockaddr_in made{};
            made.sin_family = AF_INET;
            made.sin_port = htons(static_cast<in_port_t>(number));
            inet_pton(AF_INET, address.c_str(), &made.sin_addr);
            return made;
        };
        const sockaddr_in own = name(from, 0);
        const sockaddr_in veltd = name("127.0.0.1", tcpPort);
        EXPECT_EQ(bind(descriptor, reinterpret_cast<const sockaddr*>(&own), sizeof own), 0);
        EXPECT_EQ(connect(descriptor, reinterpret_cast<const sockaddr*>(&veltd), sizeof veltd), 0);
        return Client(descriptor);
    }

    /// Sends so many wrong tokens at once. Their answers need not be waited for.
    std::vector<Client> guess(const std::string& from, int count) const {
        std::vector<Client> clients;
        for (int i = 0; i < count; ++i) {
            clients.push_back(connectFrom(from));
            clients.back().send(requestText("GET", "/api/status", wrongToken));
        }
        return clients;
    }

    static int statusForRoot(const std::string& path) {
        return Client::unixSocket((worldRoot / "run/velt/veltd.sock").string())
            .ask(requestText("GET", path))
            .status;
    }

    static std::string banned() {
        const Json::Value answer = jsonOf(done({"bans", "list", "--json"}));
        std::string text;
        for (const Json::Value& ban : answer["bans"]) {
            text += ban["address"].asString() + " ";
        }
        return text;
    }
};

/// Keeps whoever wants to change the state waiting.
UniqueFd holdState() {
    UniqueFd lock(open((worldRoot / "var/lib/velt/lock").c_str(), O_RDWR | O_CLOEXEC));
    EXPECT_EQ(flock(lock.get(), LOCK_EX), 0);
    return lock;
}

TEST_F(TokenGuessing, delaysNobodyWhileItsBanWaits) {
    UniqueFd lock = holdState();
    for (Client& client : guess(guesser, 8)) {
        EXPECT_EQ(client.receive().status, 401);
    }
    for (const char* path :
         {"/healthz", "/api/settings", "/api/status", "/api/bans", "/api/log", "/metrics"}) {
        EXPECT_EQ(statusForRoot(path), 200) << path;
    }
    EXPECT_EQ(banned(), "") << "the lock was held all the time";
    lock = UniqueFd();
    EXPECT_TRUE(waitUntil([] { return banned() == guesser + " "; }, patience)) << banned();
    EXPECT_EQ(connectFrom(guesser).ask(requestText("GET", "/api/status", wrongToken)).status, 429);
}

TEST_F(TokenGuessing, ofOneHidesNoneOfAnother) {
    UniqueFd lock = holdState();
    for (int i = 0; i < 10; ++i) { // more than may wait, in all
        for (Client& client : guess(guesser, 200)) {
            EXPECT_EQ(client.receive().status, 401);
        }
    }
    for (Client& client : guess(other, 3)) {
        EXPECT_EQ(client.receive().status, 401);
    }
    lock = UniqueFd();
    EXPECT_TRUE(waitUntil([] { return banned() == guesser + " " + other + " "; }, patience)) << banned();
}

} // namespace
} // namespace velt::test
