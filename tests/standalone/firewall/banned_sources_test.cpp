// Who is banned, as another host notices.

#include "standalone/firewall/banned_sources.h"

#include "ftp/ftp_library.h"
#include "platform/firewall.h"
#include "standalone/bans/ban_list.h"
#include "standalone/contract/last_error.h"
#include "standalone/core/state_lock.h"
#include "tests/standalone/firewall/firewall_test.h"
#include "tests/support/run_program.h"
#include "tests/support/waiting.h"

#include <chrono>
#include <string>
#include <thread>

namespace velt::test {
namespace {

using BannedSources = FirewallTest;

BannedSource source(const std::string& network, int seconds) {
    return {parseIpNetwork(network).value(), std::chrono::seconds(seconds)};
}

void storeBanOf(const std::string& network, int seconds) {
    const auto now = Ban::Clock::now();
    const auto lock = StateLock::take();
    ASSERT_TRUE(
        storeBan({parseIpNetwork(network).value(), now + std::chrono::seconds(seconds), "ftp", 10}, now));
}

TEST_F(BannedSources, WhoIsBannedReachesNoLoginUntilTheTimeHasPassed) {
    const OpenPort control(2121);
    const OpenPort passive(55600);
    const OpenPort other(8080);
    for (const char* mode : {"mode = accept", "mode = drop\nports = 8080"}) {
        setMode(mode);
        ASSERT_EQ(VELTFwRuleHup(), 0) << lastErrorSentence();
        EXPECT_TRUE(banSource(source("192.0.2.3", 60)) == true);
        EXPECT_TRUE(network_->neighbourReaches(2121)) << "another address is banned";
        EXPECT_TRUE(banSource(source("192.0.2.2", 3)) == true);
        EXPECT_FALSE(network_->neighbourReaches(2121));
        EXPECT_TRUE(network_->neighbourReaches(55600)) << "data of an open session";
        EXPECT_TRUE(network_->neighbourReaches(8080)) << "not ours";
        EXPECT_TRUE(waitUntil([this] { return network_->neighbourReaches(2121); }, patience));
    }
}

TEST_F(BannedSources, ABanLastsItsNewTime) {
    const OpenPort control(2121);
    ASSERT_EQ(VELTFwRuleHup(), 0) << lastErrorSentence();
    ASSERT_TRUE(banSource(source("192.0.2.2", 1)) == true);
    ASSERT_TRUE(banSource(source("192.0.2.2", 600)) == true);
    std::this_thread::sleep_for(std::chrono::milliseconds(1500));
    EXPECT_FALSE(network_->neighbourReaches(2121));
    EXPECT_TRUE(admitSource(source("192.0.2.2", 0).source) == true);
    EXPECT_TRUE(network_->neighbourReaches(2121));
    EXPECT_TRUE(admitSource(source("192.0.2.2", 0).source) == true) << "it is not there, which is well";
}

/// Whether a connection over IPv6 comes about here, from one address to another.
bool reachesIPv6(const std::string& from, const std::string& to, int port) {
    const auto result = runProcess({"curl", "--silent", "--max-time", "1", "--write-out", "%{time_connect}",
                                    "--interface", from, "telnet://[" + to + "]:" + std::to_string(port)});
    return !result.output.empty() && result.output != "0.000000";
}

TEST_F(BannedSources, ANetworkOfIPv6IsBannedAsAWhole) {
    const OpenPort control(2121);
    for (const char* address :
         {"2001:db8::1", "2001:db8:0:1::2", "2001:db8:0:1:ffff::3", "2001:db8:0:2::2"}) {
        ASSERT_EQ(runProcess({"ip", "address", "add", std::string(address) + "/128", "dev", "lo"}).exitCode,
                  0);
    }
    ASSERT_EQ(VELTFwRuleHup(), 0) << lastErrorSentence();
    ASSERT_TRUE(banSource(source("2001:db8:0:1::/64", 60)) == true);
    std::string answers;
    for (const char* from : {"2001:db8:0:1::2", "2001:db8:0:1:ffff::3", "2001:db8:0:2::2"}) {
        answers += reachesIPv6(from, "2001:db8::1", 2121) ? "y" : "n";
    }
    EXPECT_EQ(answers, "nny");
}

TEST_F(BannedSources, ABanIsNoChangeOfSomebodyElse) {
    ASSERT_EQ(VELTFwRuleHup(), 0) << lastErrorSentence();
    const std::uint32_t loaded = generation();
    storeBanOf("192.0.2.9", 600);
    ASSERT_TRUE(banSource(source("192.0.2.9", 600)) == true);
    EXPECT_EQ(generation(), loaded + 1);
    EXPECT_EQ(VELTFwRuleHup(), 0) << lastErrorSentence();
    EXPECT_EQ(generation(), loaded + 1) << "loaded again";
    EXPECT_NE(listTable().find("192.0.2.9"), std::string::npos) << listTable();
}

TEST_F(BannedSources, ABanAfterAChangeOfSomebodyElseHidesNothing) {
    const OpenPort other(8080);
    setMode("mode = drop");
    ASSERT_EQ(VELTFwRuleHup(), 0) << lastErrorSentence();
    ASSERT_EQ(runProcess({"nft", "insert", "rule", "inet", "velt_fileserv", "input", "accept"}).exitCode, 0);
    ASSERT_TRUE(banSource(source("192.0.2.9", 600)) == true);
    ASSERT_TRUE(network_->neighbourReaches(8080));
    EXPECT_EQ(VELTFwRuleHup(), 0) << lastErrorSentence();
    EXPECT_FALSE(network_->neighbourReaches(8080));
}

TEST_F(BannedSources, RulesThatAreLoadedAgainKeepTheBans) {
    const OpenPort next(2122);
    ASSERT_EQ(VELTFwRuleHup(), 0) << lastErrorSentence();
    storeBanOf("192.0.2.2", 600);
    storeBanOf("2001:db8::/64", 600);
    storeFtp(2122, VELT_FTP_SERVICE_PLAIN);
    ASSERT_EQ(VELTFwRuleHup(), 0) << lastErrorSentence();
    EXPECT_FALSE(network_->neighbourReaches(2122));
    EXPECT_NE(listTable().find("2001:db8:: timeout 9m5"), std::string::npos) << listTable();
}

TEST_F(BannedSources, WithoutRulesNobodyIsRefused) {
    EXPECT_TRUE(banSource(source("192.0.2.2", 60)) == false);
    EXPECT_TRUE(firewallRefuses() == false);
    ASSERT_EQ(VELTFwRuleHup(), 0) << lastErrorSentence();
    EXPECT_TRUE(firewallRefuses() == true);
    setMode("mode = off");
    ASSERT_EQ(VELTFwRuleHup(), 0) << lastErrorSentence();
    EXPECT_TRUE(banSource(source("192.0.2.2", 60)) == false);
    EXPECT_TRUE(admitSource(source("192.0.2.2", 60).source) == false);
    EXPECT_TRUE(firewallRefuses() == false);
    EXPECT_EQ(listTable(), "");
}

} // namespace
} // namespace velt::test
