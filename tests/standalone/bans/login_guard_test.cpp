// From failed logins to a ban, and out of it again.
#include "standalone/bans/login_guard.h"

#include "standalone/journal/admin_log.h"
#include "standalone/journal/request_actor.h"
#include "tests/standalone/support/state_folder.h"
#include "tests/support/result.h"

#include <gtest/gtest.h>

#include <string>

namespace velt {
namespace {

class LoginGuard : public testing::Test {
protected:
    void SetUp() override { set("failures = 3\nban_seconds = 900\nnever = \"198.51.100.0/24\""); }
    void TearDown() override { setRequestActor("", ""); }

    void set(const std::string& lines) { root_.write("etc/velt/bans.conf", "version = 1\n" + lines + "\n"); }

    static void fail(const std::string& address, int times, const std::string& service = "sftp") {
        for (int i = 0; i < times; ++i) {
            noteFailedLogin(service, address);
        }
    }

    static std::string banned() {
        const auto current = currentBans();
        std::string text = test::messageOf(current);
        for (const Ban& each : current.valueOr({}).bans) {
            text += toText(each.source) + " " + each.service + " ";
        }
        return text;
    }

    static std::vector<std::string> logged() {
        std::vector<std::string> sentences;
        for (const LogEntry& entry : queryLog({}).valueOr({})) {
            sentences.push_back(entry.actor + ": " + entry.sentence);
        }
        return sentences;
    }

    test::StateFolder root_;
};

TEST_F(LoginGuard, BansWhoFailsTooOften) {
    fail("192.0.2.1", 2);
    EXPECT_EQ(banned(), "");
    EXPECT_FALSE(currentBanOf("192.0.2.1"));
    fail("192.0.2.1", 1);
    EXPECT_EQ(banned(), "192.0.2.1 sftp ");
    const auto ban = currentBanOf("192.0.2.1");
    ASSERT_TRUE(ban);
    const auto left = ban->until - Ban::Clock::now();
    EXPECT_TRUE(left > std::chrono::seconds(890) && left <= std::chrono::seconds(901));
    EXPECT_EQ(ban->failures, 3);
    EXPECT_FALSE(currentBanOf("192.0.2.2"));
    EXPECT_EQ(logged(),
              std::vector<std::string>{
                  ": Logins from 192.0.2.1 are refused for 900 seconds after 3 failed ones at SFTP."});
    const std::string event = root_.read("var/log/velt/events.jsonl");
    EXPECT_NE(event.find(R"("velt.login.ban")"), std::string::npos) << event;
    EXPECT_NE(event.find(R"("ADDRESS":"192.0.2.1")"), std::string::npos) << event;
}

TEST_F(LoginGuard, BansTheNetworkOfACustomer) {
    fail("2001:db8::1", 1);
    fail("2001:db8::2", 1);
    fail("2001:db8::3", 1, "ftp");
    EXPECT_EQ(banned(), "2001:db8::/64 ftp ");
    EXPECT_TRUE(currentBanOf("2001:db8::99"));
    EXPECT_FALSE(currentBanOf("2001:db8:0:1::99"));
}

TEST_F(LoginGuard, BansAndLogsOnceWhoGoesOnGuessing) {
    fail("192.0.2.1", 3);
    const auto first = currentBanOf("192.0.2.1");
    ASSERT_TRUE(first);
    const std::string event = root_.read("var/log/velt/events.jsonl");
    set("failures = 1\nban_seconds = 1800");
    fail("192.0.2.1", 30);
    fail("192.0.2.1", 30, "ftp");
    EXPECT_EQ(currentBanOf("192.0.2.1"), first);
    EXPECT_EQ(logged().size(), 1U);
    EXPECT_EQ(root_.read("var/log/velt/events.jsonl"), event);
}

TEST_F(LoginGuard, BansAgainWhenABanHasEnded) {
    fail("192.0.2.1", 3);
    root_.write("run/velt/bans", "192.0.2.1 1000000000 sftp 3\n");
    fail("192.0.2.1", 2);
    EXPECT_EQ(banned(), "");
    fail("192.0.2.1", 1);
    EXPECT_EQ(banned(), "192.0.2.1 sftp ");
    EXPECT_EQ(logged().size(), 2U);
}

TEST_F(LoginGuard, TellsWhoseFailuresAreCountedTogether) {
    EXPECT_EQ(sourceOfLogin("192.0.2.1"), "192.0.2.1");
    EXPECT_EQ(sourceOfLogin("2001:db8::1"), "2001:db8::/64");
    EXPECT_EQ(sourceOfLogin("nonsense"), "");
}

TEST_F(LoginGuard, SparesLoopbackAndWhomTheSettingsName) {
    for (const char* address :
         {"127.0.0.1", "127.0.0.2", "::1", "::ffff:127.0.0.1", "198.51.100.9", "nonsense"}) {
        fail(address, 10);
    }
    EXPECT_EQ(banned(), "");
    EXPECT_TRUE(logged().empty());
}

TEST_F(LoginGuard, LetsLoopbackInWhateverTheListSays) {
    root_.write("run/velt/bans", "127.0.0.1 4000000000 ftp 10\n::1 4000000000 ftp 10\n"
                                 "192.0.2.8 4000000000 ftp 10\n");
    EXPECT_TRUE(currentBanOf("192.0.2.8"));
    EXPECT_FALSE(currentBanOf("127.0.0.1"));
    EXPECT_FALSE(currentBanOf("::1"));
}

TEST_F(LoginGuard, LetsEverybodyTryWhereItIsOff) {
    set("enabled = 0\nfailures = 1");
    fail("192.0.2.3", 10);
    EXPECT_EQ(banned(), "");
}

TEST_F(LoginGuard, HasItsDefaultsWhereTheSettingsAreDamaged) {
    set("failures = none");
    fail("192.0.2.4", 9);
    EXPECT_EQ(banned(), "");
    fail("192.0.2.4", 1);
    EXPECT_EQ(banned(), "192.0.2.4 sftp ");
}

TEST_F(LoginGuard, LiftsABanOnBehalfOfAnAdministrator) {
    set("failures = 1");
    fail("192.0.2.5", 1);
    fail("2001:db8:5::1", 1);
    setRequestActor("anna", "local");
    EXPECT_TRUE(liftBan("192.0.2.6") == false);
    EXPECT_TRUE(liftBan("2001:db8:5::/48") == false) << "wider than any ban";
    EXPECT_TRUE(liftBan("no address") == false);
    EXPECT_TRUE(liftBan("192.0.2.5") == true);
    EXPECT_TRUE(liftBan("192.0.2.5") == false);
    EXPECT_EQ(banned(), "2001:db8:5::/64 sftp ");
    EXPECT_TRUE(liftBan("2001:db8:5::77") == true) << "an address of the network";
    EXPECT_EQ(banned(), "");
    ASSERT_EQ(logged().size(), 4U);
    EXPECT_EQ(logged()[0], "anna: The ban of 2001:db8:5::/64 was lifted.");
    const std::string events = root_.read("var/log/velt/events.jsonl");
    const std::size_t lifted = events.find(R"("ACTION":"lifted")");
    ASSERT_NE(lifted, std::string::npos) << events;
    EXPECT_NE(events.find(R"("ADDRESS":"192.0.2.5")", lifted), std::string::npos) << events;
}

TEST_F(LoginGuard, HandsTheFirewallWhatIsLeftOfEachBan) {
    set("failures = 1\nban_seconds = 60");
    fail("192.0.2.7", 1);
    const auto sources = sourcesToRefuse();
    ASSERT_TRUE(sources);
    ASSERT_EQ(sources->size(), 1U);
    const BannedSource& first = sources->front();
    EXPECT_EQ(toText(first.source), "192.0.2.7");
    EXPECT_TRUE(first.left > std::chrono::seconds(50) && first.left <= std::chrono::seconds(60));
    const auto current = currentBans();
    ASSERT_TRUE(current);
    EXPECT_FALSE(current->firewall) << "below this root no rule is touched";
}

} // namespace
} // namespace velt
