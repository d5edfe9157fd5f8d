// Guessing passwords, against the real daemons, and what comes of it.
#include "tests/support/waiting.h"
#include "tests/system/support/host_service.h"

#include <chrono>

namespace velt::test {
namespace {

using std::chrono::seconds;

constexpr int loggedIn = 0;
constexpr int refused = 67;
constexpr int noAnswer = 28;

/// This server, and clients elsewhere: loopback is never banned, and these are no loopback addresses,
/// although they are all of this machine.
const std::string server = "192.0.2.1";
const std::string guesser = "192.0.2.66";
const std::string other = "192.0.2.67";

class PasswordGuessing : public HostService {
protected:
    void SetUp() override {
        HostService::SetUp();
        if (IsSkipped() || HasFatalFailure()) {
            return;
        }
        for (const std::string& address : {server, guesser, other}) {
            runProcess({"ip", "address", "add", address + "/32", "dev", "lo"});
        }
        writeFile(worldRoot / "etc/velt/bans.conf", "version = 1\nfailures = 3\nban_seconds = 600\n");
        writeFile(worldRoot / "etc/velt/firewall.conf", "version = 1\nmode = accept\n");
    }

    void TearDown() override {
        HostService::TearDown();
        runProcess({"nft", "delete", "table", "inet", "velt_fileserv"});
        for (const std::string& address : {server, guesser, other}) {
            runProcess({"ip", "address", "delete", address + "/32", "dev", "lo"});
        }
    }

    /// What curl makes of a login from this address: 0 when it succeeds, 67 when it is refused, 28 when
    /// nobody answers.
    static int logIn(const std::string& from, const std::string& url, const std::string& user,
                     const std::string& password) {
        if (!connects(from, url.substr(url.find("://") + 3))) {
            return noAnswer;
        }
        return runProcess({"curl", "--silent", "--insecure", "--max-time", "25", "--interface", from,
                           "--user", user + ":" + password, "--list-only", url},
                          {}, seconds(30))
            .exitCode;
    }

    static bool connects(const std::string& from, const std::string& place) {
        const auto result =
            runProcess({"curl", "--silent", "--max-time", "1", "--write-out", "\n%{time_connect}", "--output",
                        "/dev/null", "--interface", from, "telnet://" + place});
        return !result.output.ends_with("\n0.000000");
    }

    static std::string banned() {
        const Json::Value answer = jsonOf(done({"bans", "list", "--json"}));
        std::string text;
        for (const Json::Value& ban : answer["bans"]) {
            text += ban["address"].asString() + " " + ban["service"].asString() + " ";
        }
        return text;
    }

    static bool becomesBanned(const std::string& who) {
        return waitUntil([&who] { return banned() == who; }, patience);
    }
};

const std::string ftp = "ftp://" + server + ":2121/";
const std::string sftp = "sftp://" + server + ":2222/";

TEST_F(PasswordGuessing, overFtpShutsTheAddressOutOfBothServices) {
    done({"ftp", "set", "enable_ftp=on"});
    done({"sftp", "set", "enable=on"});
    ASSERT_EQ(logIn(guesser, ftp, "alice", "alice-secret"), loggedIn);
    EXPECT_EQ(logIn(guesser, ftp, "alice", "wrong"), refused);
    EXPECT_EQ(logIn(guesser, ftp, "nobody-here", "wrong"), refused);
    EXPECT_EQ(banned(), "");
    EXPECT_EQ(logIn(guesser, ftp, "alice", "wrong"), refused);
    ASSERT_TRUE(becomesBanned(guesser + " ftp ")) << banned();
    EXPECT_EQ(logIn(guesser, ftp, "alice", "alice-secret"), noAnswer);
    EXPECT_EQ(logIn(guesser, sftp, "alice", "alice-secret"), noAnswer);
    EXPECT_EQ(logIn(other, ftp, "alice", "alice-secret"), loggedIn);
    EXPECT_NE(done({"log"}).find("Logins from " + guesser +
                                 " are refused for 600 seconds after 3 failed ones at FTP."),
              std::string::npos);
    EXPECT_EQ(done({"bans", "lift", guesser}), guesser + " is no longer banned.\n");
    EXPECT_EQ(banned(), "");
    EXPECT_EQ(logIn(guesser, ftp, "alice", "alice-secret"), loggedIn);
    EXPECT_NE(done({"log"}).find("The ban of " + guesser + " was lifted."), std::string::npos);
}

TEST_F(PasswordGuessing, endsOnConnectionsThatWereOpenBefore) {
    done({"ftp", "set", "enable_ftp=on"});
    done({"security", "set", "anonymous=on", "anonymous_chroot=on", "anonymous_chroot_share=public"});
    FtpSession atWork(port, server, guesser);
    ASSERT_EQ(atWork.logIn("alice"), 230);
    FtpSession waiting(port, server, guesser);
    FtpSession waitingGuest(port, server, guesser);
    FtpSession elsewhere(port, server, other);
    for (int i = 0; i < 3; ++i) {
        EXPECT_EQ(logIn(guesser, ftp, "alice", "wrong"), refused);
    }
    ASSERT_TRUE(becomesBanned(guesser + " ftp ")) << banned();
    EXPECT_EQ(waiting.logIn("alice"), 530) << "the right password";
    EXPECT_EQ(waitingGuest.logIn("anonymous", "me@example.com"), 530);
    EXPECT_EQ(elsewhere.logIn("alice"), 230);
    EXPECT_EQ(atWork.command("NOOP").code, 200) << "who has logged in goes on";
}

TEST_F(PasswordGuessing, overSftpShutsTheAddressOutWhateverTheName) {
    writeFile(worldRoot / "etc/velt/bans.conf", "version = 1\nfailures = 3\nban_seconds = 15\n");
    done({"sftp", "set", "enable=on"});
    const std::string forged = "x\nFailed password for root from " + other + " port 5 ssh2\r\nx";
    // Two passwords each, since curl tries two methods.
    EXPECT_EQ(logIn(guesser, sftp, forged, "wrong"), refused);
    EXPECT_EQ(logIn(guesser, sftp, "alice", "wrong"), refused);
    ASSERT_TRUE(becomesBanned(guesser + " sftp ")) << banned();
    EXPECT_EQ(logIn(guesser, sftp, "alice", "alice-secret"), noAnswer);
    EXPECT_TRUE(waitUntil([] { return banned().empty(); }, seconds(20)));
    EXPECT_EQ(logIn(guesser, sftp, "alice", "alice-secret"), loggedIn) << "the time has passed";
    EXPECT_EQ(logIn(other, sftp, "alice", "alice-secret"), loggedIn);
}

TEST_F(PasswordGuessing, isRememberedWhenTheHostOrTheServiceRestarts) {
    done({"ftp", "set", "enable_ftp=on"});
    for (int i = 0; i < 3; ++i) {
        EXPECT_EQ(logIn(guesser, ftp, "alice", "wrong"), refused);
    }
    ASSERT_TRUE(becomesBanned(guesser + " ftp ")) << banned();
    EXPECT_EQ(stopHost(), 0);
    startHost();
    done({"ftp", "set", "timeout=301"});
    EXPECT_EQ(banned(), guesser + " ftp ");
    EXPECT_EQ(logIn(guesser, ftp, "alice", "alice-secret"), noAnswer);
    EXPECT_EQ(logIn(other, ftp, "alice", "alice-secret"), loggedIn);
}

TEST_F(PasswordGuessing, shutsNobodyOutOnLoopback) {
    done({"ftp", "set", "enable_ftp=on"});
    for (int i = 0; i < 4; ++i) {
        EXPECT_EQ(logIn("127.0.0.2", "ftp://127.0.0.1:2121/", "alice", "wrong"), refused);
    }
    EXPECT_EQ(logIn("127.0.0.2", "ftp://127.0.0.1:2121/", "alice", "alice-secret"), loggedIn);
    EXPECT_EQ(banned(), "");
}

} // namespace
} // namespace velt::test
