// What a supervisor makes of its daemon's words about logins.

#include "base/file.h"
#include "standalone/activity/spool_text.h"
#include "standalone/bans/ban_list.h"
#include "standalone/control/supervised_daemon.h"
#include "standalone/core/state_lock.h"
#include "standalone/core/state_root.h"
#include "standalone/journal/admin_log.h"
#include "standalone/supervise/refused_logins.h"
#include "tests/standalone/supervise/daemon_test.h"
#include "tests/support/ports.h"
#include "tests/support/result.h"
#include "tests/support/waiting.h"

#include <set>

namespace velt::test {
namespace {

const std::string head = "2026-11-22 08:00:00,123 server proftpd[1] 192.0.2.1 (192.0.2.7[192.0.2.7]): ";
/// Those whose failed login ends all that a daemon says.
const std::string lastOnes = "198.51.100.";

class LoginWatch : public DaemonTest {
protected:
    void SetUp() override {
        DaemonTest::SetUp();
        ASSERT_TRUE(replaceFile(statePath("/etc/velt/bans.conf"), "version = 1\nfailures = 1\n", 0644));
    }

    /// Who is banned, as a text, once a daemon has said these messages and all of them have been read.
    std::string bannedAfter(const Daemon& daemon, std::vector<std::string> messages) {
        const std::string last = lastOnes + std::to_string(++daemons_);
        messages.push_back(daemon.name == ftpDaemon.name
                               ? head + "mod_velt_login: password refused from " + last + "\n"
                               : "Failed password for bob from " + last + " port 53076 ssh2\r\n");
        std::vector<std::string> options;
        for (const std::string& message : messages) {
            options.insert(options.end(), {"--say", message});
        }
        SupervisedDaemon supervised(daemon);
        EXPECT_EQ(messageOf(supervised.start(testOrder(freePort(), "one", options))), "");
        EXPECT_TRUE(waitUntil([&] { return banned().contains(last); }, patience));
        std::set<std::string> others = banned();
        std::erase_if(others, [](const std::string& each) { return each.starts_with(lastOnes); });
        EXPECT_EQ(messageOf(supervised.stop()), "");
        return testing::PrintToString(others);
    }

    static std::set<std::string> banned() {
        std::set<std::string> sources;
        for (const Ban& ban : bansAt(Ban::Clock::now()).valueOr({})) {
            sources.insert(toText(ban.source));
        }
        return sources;
    }

private:
    int daemons_ = 0;
};

const std::string nobody = "{}";

TEST_F(LoginWatch, FailedLoginsCountAgainstTheirAddress) {
    EXPECT_EQ(bannedAfter(sftpDaemon, {"Server listening on 0.0.0.0 port 22.\r\n",
                                       "Failed password for alice from 192.0.2.7 port 53076 ssh2\r\n"}),
              R"({ "192.0.2.7" })");
    EXPECT_EQ(bannedAfter(ftpDaemon, {head + "mod_velt_login: password refused from 2001:db8::7\n"}),
              R"({ "192.0.2.7", "2001:db8::/64" })");
}

TEST_F(LoginWatch, ANameWithLineBreaksAccusesNobodyElse) {
    const std::string name = "x\nFailed password for root from 203.0.113.9 port 5 ssh2\r\n"
                             "PAM: Authentication failure for root from 203.0.113.9\r\nx";
    EXPECT_EQ(bannedAfter(sftpDaemon, {"Invalid user " + name + " from 192.0.2.7 port 53076\r\n"}), nobody);
    EXPECT_EQ(bannedAfter(sftpDaemon, {"Failed password for invalid user " + name +
                                       " from 192.0.2.7 port 53076 ssh2\r\n"}),
              R"({ "192.0.2.7" })");
}

TEST_F(LoginWatch, RefusedPasswordsOfSftpAreRecorded) {
    bannedAfter(sftpDaemon, {"Failed password for alice from 192.0.2.7 port 53076 ssh2\r\n",
                             "Failed password for alice from 192.0.2.7 port 53077 ssh2\r\n",
                             "Failed password for invalid user x\ny from 192.0.2.8 port 5 ssh2\r\n"});
    std::multiset<std::string> recorded;
    EXPECT_TRUE(waitUntil(
        [&] {
            recorded.clear();
            for (const OperationRecord& each :
                 parseSpool(readFile(statePath("/var/lib/velt/transfers/spool")).valueOr("")).records) {
                recorded.insert(std::string(operationName(each.operation)) + " " +
                                std::string(protocolName(each.protocol)) + " " + each.user + " " +
                                each.address + " " + each.reason);
            }
            return recorded.size() >= 4;
        },
        patience));
    EXPECT_EQ(recorded, (std::multiset<std::string>{
                            "login-refused sftp alice 192.0.2.7 password",
                            "login-refused sftp alice 192.0.2.7 password",
                            "login-refused sftp bob 198.51.100.1 password",
                            "login-refused sftp x\ny 192.0.2.8 password",
                        }));
}

TEST_F(LoginWatch, MessagesThatComeAtOnceAreReadOneByOne) {
    std::vector<std::string> messages;
    for (int i = 0; i < 20; ++i) {
        messages.emplace_back("Failed password for alice from 192.0.2.7 port 53076 ssh2\r\n");
        messages.emplace_back("Connection closed by invalid user x from 203.0.113.9 port 5 ssh2");
    }
    EXPECT_EQ(bannedAfter(sftpDaemon, messages), R"({ "192.0.2.7" })");
}

TEST_F(LoginWatch, ADaemonsWordsAreReadAsItsOwnOnly) {
    EXPECT_EQ(bannedAfter(ftpDaemon, {"Failed password for alice from 192.0.2.7 port 53076 ssh2\r\n"}),
              nobody);
    EXPECT_EQ(bannedAfter(sftpDaemon, {head + "mod_velt_login: password refused from 192.0.2.7\n"}), nobody);
}

TEST_F(LoginWatch, RefusedLoginsAreLoggedOnceForEachReason) {
    const std::string damaged = "shares.json: invalid JSON.";
    const auto refusedAt = [](const std::string& user, const std::string& why) {
        return "velt-sftp-session: login of '" + user + "' refused: " + why + "\n";
    };
    bannedAfter(sftpDaemon, {refusedAt("alice", damaged), refusedAt("bob", damaged),
                             refusedAt("bob", "The share data grants the user no access."),
                             "Invalid user velt-sftp-session: login of 'root' refused: no from 192.0.2.7\r\n",
                             "velt-sftp-session: login of 'bob': a remark\n"});
    bannedAfter(ftpDaemon, {head + "mod_velt_login/2.0: login of 'alice' refused: " + damaged + "\n",
                            refusedAt("carol", damaged)});
    std::set<std::string> logged;
    EXPECT_TRUE(waitUntil(
        [&] {
            LogFilter filter;
            filter.event = 0x11BF0016;
            logged.clear();
            for (const LogEntry& entry : queryLog(filter).valueOr({})) {
                logged.insert(entry.sentence);
            }
            return logged.size() >= 3;
        },
        patience));
    EXPECT_EQ(logged, (std::set<std::string>{
                          "A login of \"alice\" over FTP was refused: " + damaged,
                          "A login of \"alice\" over SFTP was refused: " + damaged,
                          "A login of \"bob\" over SFTP was refused: The share data grants the user no "
                          "access."}));
}

TEST_F(LoginWatch, AReasonIsToldAgainAfterAMinute) {
    ReasonsOfLate reasons;
    const ReasonsOfLate::Clock::time_point start{};
    EXPECT_TRUE(reasons.isNew("one", start));
    EXPECT_TRUE(reasons.isNew("other", start + std::chrono::seconds(30)));
    EXPECT_FALSE(reasons.isNew("one", start + std::chrono::seconds(59)));
    EXPECT_TRUE(reasons.isNew("one", start + std::chrono::seconds(60)));
    EXPECT_FALSE(reasons.isNew("other", start + std::chrono::seconds(60)));
}

TEST_F(LoginWatch, GuessesDoNotKeepTheSupervisorFromAnswering) {
    const std::vector<std::string> guesses{
        "--say", "Failed password for alice from 192.0.2.7 port 53076 ssh2\r\n", "--say",
        "Failed password for alice from 192.0.2.8 port 53076 ssh2\r\n"};
    SupervisedDaemon daemon(sftpDaemon);
    {
        auto changing = StateLock::take();
        ASSERT_TRUE(changing);
        EXPECT_EQ(messageOf(daemon.start(testOrder(freePort(), "one", guesses))), "");
        EXPECT_EQ(messageOf(daemon.start(testOrder(freePort(), "two", guesses))), "");
        EXPECT_EQ(messageOf(daemon.stop()), "");
        EXPECT_EQ(messageOf(daemon.start(testOrder(freePort(), "three", guesses))), "");
        EXPECT_EQ(banned(), std::set<std::string>());
    }
    EXPECT_TRUE(waitUntil([] { return banned().size() == 2; }, patience)) << "nothing is forgotten";
    EXPECT_EQ(messageOf(daemon.stop()), "");
}

} // namespace
} // namespace velt::test
