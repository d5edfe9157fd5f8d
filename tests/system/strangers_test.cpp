// Many connections of one address that do not log in.
#include "tests/support/waiting.h"
#include "tests/system/support/ftp_service.h"

#include <sys/socket.h>

#include <array>
#include <filesystem>
#include <vector>

namespace velt::test {
namespace {

/// Loopback is spared, so this server and its clients have addresses that are none, although they are all of
/// this machine.
const std::string server = "192.0.2.1";
const std::string idler = "192.0.2.66";
const std::string other = "192.0.2.67";

class Strangers : public FtpService {
protected:
    void SetUp() override {
        FtpService::SetUp();
        if (IsSkipped() || HasFatalFailure()) {
            return;
        }
        for (const std::string& address : {server, idler, other}) {
            runProcess({"ip", "address", "add", address + "/32", "dev", "lo"});
        }
    }
    void TearDown() override {
        idle_.clear();
        FtpService::TearDown();
        for (const std::string& address : {server, idler, other}) {
            runProcess({"ip", "address", "delete", address + "/32", "dev", "lo"});
        }
    }

    /// Connects so often, and keeps what is open; the first digits of the greetings, each counted.
    struct Greetings {
        int welcome = 0;  ///< 220
        int sentAway = 0; ///< 421
        int other = 0;
    };
    Greetings comeAndIdle(int times, const std::string& from, const std::string& to = server) {
        Greetings greetings;
        for (int i = 0; i < times; i++) {
            UniqueFd connection = connectTo(to, port, from);
            const std::string code = connection ? firstDigits(connection) : "";
            (code == "220" ? greetings.welcome : code == "421" ? greetings.sentAway : greetings.other)++;
            if (code == "220") {
                idle_.push_back(std::move(connection));
            }
        }
        return greetings;
    }
    static std::string firstDigits(const UniqueFd& connection) {
        std::array<char, 4> text{};
        return recv(connection.get(), text.data(), 3, MSG_WAITALL) == 3 ? text.data() : "";
    }
    /// The exit code of curl: 0 when the user logs in and gets the file.
    static int fetchFrom(const std::string& address, const std::string& user = "alice") {
        return curl({"--interface", address, "--user", user + ":" + user + "-secret", "--output", "/dev/null",
                     "ftp://" + server + ":2121/home-of"})
            .exitCode;
    }

    std::vector<UniqueFd> idle_;
};

TEST_F(Strangers, ofOneAddressKeepNobodyElseOut) {
    start();
    const Greetings greetings = comeAndIdle(2050, idler);
    EXPECT_EQ(greetings.welcome, 100);
    EXPECT_EQ(greetings.sentAway, 1950);
    EXPECT_EQ(greetings.other, 0);
    EXPECT_EQ(fetchFrom(other), 0);
    EXPECT_NE(fetchFrom(idler), 0);
    idle_.pop_back();
    EXPECT_TRUE(waitUntil([] { return fetchFrom(idler) == 0; }, std::chrono::seconds(10)))
        << "there is room for one more";
}

TEST_F(Strangers, areThoseWhoHaveNotLoggedIn) {
    letAnonymousIn();
    start();
    std::vector<FtpSession> sessions;
    for (int i = 0; i < 3; i++) {
        ASSERT_EQ(sessions.emplace_back(port, server).logIn("alice"), 230);
        ASSERT_EQ(sessions.emplace_back(port, server).logIn("anonymous", "a@b"), 230);
    }
    // They come from the server's own address.
    EXPECT_EQ(comeAndIdle(101, server).welcome, 100);
    EXPECT_EQ(FtpSession(port, server).greeting().code, 421);
    EXPECT_EQ(sessions[0].command("NOOP").code, 200);
}

TEST_F(Strangers, areCountedByAllDaemonsOfTheService) {
    start();
    EXPECT_EQ(comeAndIdle(60, idler).welcome, 60);
    kill(daemonPid(), SIGKILL); // as a hand-over does, which leaves the sessions
    start();
    EXPECT_EQ(comeAndIdle(60, idler).welcome, 40);
}

TEST_F(Strangers, ofLoopbackAndSparedNetworksAreNotLimited) {
    writeFile(worldRoot / "etc/velt/bans.conf", "version = 1\nnever = \"192.0.2.66 198.51.100.0/24\"\n");
    start();
    EXPECT_EQ(comeAndIdle(110, idler).welcome, 110);
    EXPECT_EQ(comeAndIdle(110, "127.0.0.1", "127.0.0.1").welcome, 110);
    EXPECT_EQ(comeAndIdle(110, other).welcome, 100);
}

TEST_F(Strangers, areLimitedWhereTheListOfTheSparedIsDamaged) {
    writeFile(worldRoot / "etc/velt/bans.conf", "version = 1\nnever = \"192.0.2.0/24 nonsense\"\n");
    start();
    EXPECT_EQ(comeAndIdle(101, idler).welcome, 100);
}

} // namespace
} // namespace velt::test
