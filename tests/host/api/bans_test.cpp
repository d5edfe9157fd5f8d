// Who is banned, as the host shows and lifts it, and what a banned address gets.

#include "tests/host/fake_standalone.h"
#include "tests/host/host_test.h"
#include "tests/support/fake_platform/fake_platform.h"
#include "tests/support/waiting.h"

namespace {

using velt::test::patience;
using velt::test::waitUntil;

const std::string wrong = "Authorization: Bearer wrong\r\n";

class HostBans : public HostTest {
protected:
    void SetUp() override {
        fake::Platform::instance().reset();
        FakeStandalone::instance() = {};
    }

    static void ban(const std::string& source, int seconds = 600) {
        const auto until = std::chrono::system_clock::now() + std::chrono::seconds(seconds);
        FakeStandalone::instance().bans.push_back({velt::parseIpNetwork(source).value(), until, "sftp", 10});
    }
};

TEST_F(HostBans, AreListedForEverybodyWithAccess) {
    start();
    EXPECT_EQ(ask("GET", "/api/bans", viewer).json()["bans"].size(), 0U);
    FakeStandalone::instance().bans.push_back(
        {velt::parseIpNetwork("2001:db8::/64").value(),
         std::chrono::system_clock::time_point(std::chrono::seconds(1800000000)), "sftp", 10});
    const Json::Value list = ask("GET", "/api/bans", viewer).json();
    ASSERT_EQ(list["bans"].size(), 1U);
    EXPECT_EQ(list["bans"][0]["address"], "2001:db8::/64");
    EXPECT_EQ(list["bans"][0]["service"], "sftp");
    EXPECT_EQ(list["bans"][0]["failures"], 10);
    EXPECT_EQ(list["bans"][0]["until"], "2027-01-15T08:00:00.000Z");
    EXPECT_EQ(list["firewall"], true);
}

TEST_F(HostBans, AreLiftedByAdministratorsOnly) {
    start();
    ban("2001:db8::/64");
    EXPECT_EQ(ask("DELETE", "/api/bans/2001:db8::%2F64", viewer).status, 403);
    EXPECT_EQ(FakeStandalone::instance().bans.size(), 1U);
    FakeStandalone::instance().actor.clear();
    EXPECT_EQ(ask("DELETE", "/api/bans/2001:db8::%2F64", admin).status, 204);
    EXPECT_EQ(FakeStandalone::instance().bans.size(), 0U);
    EXPECT_EQ(FakeStandalone::instance().actor, "admin") << "for the administrator log";
    const Answer again = ask("DELETE", "/api/bans/2001:db8::%2F64", admin);
    EXPECT_EQ(again.status, 404);
    EXPECT_EQ(again.json()["detail"], "There is no ban of 2001:db8::/64.");
}

TEST_F(HostBans, StayInADryRun) {
    start();
    ban("2001:db8::/64");
    const Answer plan = ask("DELETE", "/api/bans/2001:db8::7?dry_run=true", admin);
    EXPECT_EQ(plan.status, 200);
    EXPECT_EQ(plan.json()["effects"][0]["subject"], "bans");
    EXPECT_EQ(plan.json()["effects"][1]["subject"], "2001:db8::/64");
    EXPECT_EQ(ask("DELETE", "/api/bans/192.0.2.1?dry_run=true", admin).status, 404);
    EXPECT_EQ(ask("DELETE", "/api/bans/anna?dry_run=true", admin).status, 404);
    EXPECT_EQ(ask("DELETE", "/api/bans/2001:db8::7?dryrun=true", admin).status, 400);
    EXPECT_EQ(FakeStandalone::instance().bans.size(), 1U);
}

TEST_F(HostBans, ThatCannotBeReadAreAFailure) {
    start();
    FakeStandalone::instance().sentence = "Cannot open the list.";
    FakeStandalone::instance().bansFail = true;
    EXPECT_EQ(ask("GET", "/api/bans", admin).status, 500);
    EXPECT_EQ(ask("GET", "/api/bans", admin).json()["detail"], "Cannot open the list.");
    EXPECT_EQ(ask("DELETE", "/api/bans/192.0.2.1", admin).status, 500);
}

TEST_F(HostBans, ShutOutTheirAddressOverTcp) {
    start();
    ban("127.0.0.0/8", 100);
    for (const std::string& token : {admin, wrong, std::string()}) {
        const Answer answer = ask("GET", "/api/status", token);
        EXPECT_EQ(answer.status, 429) << token;
        const int wait = std::stoi(answer.header("retry-after"));
        EXPECT_TRUE(wait > 90 && wait <= 100) << wait;
    }
    EXPECT_EQ(FakeStandalone::instance().failedLogins.size(), 0U) << "a banned address guesses nothing";
    Client local = Client::unixSocket(socketPath);
    EXPECT_EQ(local.ask(requestText("DELETE", "/api/bans/127.0.0.0%2F8", "")).status, 204);
    EXPECT_EQ(ask("GET", "/api/status", admin).status, 200);
}

TEST_F(HostBans, ComeFromWrongTokensOverTcp) {
    start();
    EXPECT_EQ(ask("GET", "/api/status", "").status, 401);
    EXPECT_EQ(ask("GET", "/api/status", admin).status, 200);
    EXPECT_EQ(FakeStandalone::instance().failedLogins.size(), 0U) << "no token is no guess";
    EXPECT_EQ(ask("GET", "/api/status", wrong).status, 401);
    const FakeStandalone& fake = FakeStandalone::instance();
    ASSERT_TRUE(waitUntil([&] { return !fake.noted().empty(); }, patience));
    Client local = Client::unixSocket(socketPath);
    EXPECT_EQ(local.ask(requestText("GET", "/api/status", wrong)).status, 401);
    EXPECT_EQ(ask("GET", "/api/status", wrong).status, 401);
    ASSERT_TRUE(waitUntil([&] { return fake.noted().size() >= 2; }, patience));
    EXPECT_EQ(fake.noted(), (std::vector<std::string>{"veltd 127.0.0.1", "veltd 127.0.0.1"}));
}

} // namespace
