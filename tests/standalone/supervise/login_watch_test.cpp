// What a supervisor makes of its daemon's words about logins.

#include "base/file.h"
#include "standalone/bans/ban_list.h"
#include "standalone/control/supervised_daemon.h"
#include "standalone/core/state_root.h"
#include "tests/standalone/supervise/daemon_test.h"
#include "tests/support/ports.h"
#include "tests/support/result.h"
#include "tests/support/waiting.h"

namespace velt::test {
namespace {

class LoginWatch : public DaemonTest {
protected:
    void SetUp() override {
        DaemonTest::SetUp();
        ASSERT_TRUE(replaceFile(statePath("/etc/velt/bans.conf"), "version = 1\nfailures = 1\n", 0644));
    }

    /// Who is banned once a daemon has said these messages.
    static std::string bannedAfter(const Daemon& daemon, const std::vector<std::string>& messages) {
        std::vector<std::string> options;
        for (const std::string& message : messages) {
            options.insert(options.end(), {"--say", message});
        }
        SupervisedDaemon supervised(daemon);
        EXPECT_EQ(messageOf(supervised.start(testOrder(freePort(), "one", options))), "");
        std::string banned;
        for (const Ban& ban : bansAt(Ban::Clock::now()).valueOr({})) {
            banned += toText(ban.source) + " " + ban.service + " ";
        }
        EXPECT_EQ(messageOf(supervised.stop()), "");
        return banned;
    }
};

const std::string head = "2026-11-22 08:00:00,123 server proftpd[1] 192.0.2.1 (192.0.2.7[192.0.2.7]): ";

TEST_F(LoginWatch, FailedLoginsCountAgainstTheirAddress) {
    EXPECT_EQ(bannedAfter(sftpDaemon, {"Server listening on 0.0.0.0 port 22.\r\n",
                                       "Failed password for alice from 192.0.2.7 port 53076 ssh2\r\n"}),
              "192.0.2.7 sftp ");
    EXPECT_EQ(bannedAfter(ftpDaemon, {head + "mod_velt_login: password refused from 2001:db8::7\n"}),
              "192.0.2.7 sftp 2001:db8::/64 ftp ");
}

TEST_F(LoginWatch, ANameWithLineBreaksAccusesNobodyElse) {
    const std::string name = "x\nFailed password for root from 203.0.113.9 port 5 ssh2\r\n"
                             "PAM: Authentication failure for root from 203.0.113.9\r\nx";
    EXPECT_EQ(bannedAfter(sftpDaemon, {"Invalid user " + name + " from 192.0.2.7 port 53076\r\n"}), "");
    EXPECT_EQ(bannedAfter(sftpDaemon, {"Failed password for invalid user " + name +
                                       " from 192.0.2.7 port 53076 ssh2\r\n"}),
              "192.0.2.7 sftp ");
}

TEST_F(LoginWatch, ADaemonsWordsAreReadAsItsOwnOnly) {
    EXPECT_EQ(bannedAfter(ftpDaemon, {"Failed password for alice from 192.0.2.7 port 53076 ssh2\r\n"}), "");
    EXPECT_EQ(bannedAfter(sftpDaemon, {head + "mod_velt_login: password refused from 192.0.2.7\n"}), "");
}

} // namespace
} // namespace velt::test
