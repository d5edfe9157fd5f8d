// What health says of the packet filter.
#include "ftp/ftp_library.h"
#include "platform/firewall.h"
#include "standalone/contract/last_error.h"
#include "standalone/firewall/table_reading.h"
#include "tests/standalone/firewall/firewall_test.h"
#include "tests/standalone/health/health_test.h"
#include "tests/support/run_program.h"

namespace velt::test {
namespace {

using FirewallHealth = FirewallTest;

TEST_F(FirewallHealth, RulesAsStoredAreWell) {
    for (const char* mode : {"mode = accept", "mode = drop\nports = 8080 2121-2130"}) {
        setMode(mode);
        ASSERT_EQ(VELTFwRuleHup(), 0) << lastErrorSentence();
        EXPECT_EQ(firewallFindings(), Findings()) << mode;
    }
    setMode("mode = off");
    EXPECT_EQ(firewallFindings(), Findings());
}

TEST_F(FirewallHealth, ASlipInTheSettingsIsNamed) {
    setMode("mode = drop");
    ASSERT_EQ(VELTFwRuleHup(), 0) << lastErrorSentence();
    setMode("mode = drop\nports = 22,443");
    const Findings found = firewallFindings();
    EXPECT_EQ(summary(found), "error firewall-settings-damaged");
    EXPECT_NE(found.at(0).sentence.find("firewall.conf, line 3"), std::string::npos) << found.at(0).sentence;
    EXPECT_EQ(found.at(0).mend, "Correct the file, then restart veltd.");
}

TEST_F(FirewallHealth, RulesThatAnotherFirewallFlushedAreMissed) {
    setMode("mode = drop");
    ASSERT_EQ(VELTFwRuleHup(), 0) << lastErrorSentence();
    EXPECT_EQ(firewallFindings(), Findings());
    ASSERT_EQ(runProcess({"nft", "flush", "ruleset"}).exitCode, 0);
    const Findings found = firewallFindings();
    EXPECT_EQ(summary(found), "error firewall-rules-missing");
    EXPECT_EQ(found.at(0).mend, "Restart veltd.");
    ASSERT_EQ(VELTFwRuleHup(), 0) << lastErrorSentence();
    EXPECT_EQ(firewallFindings(), Findings());
}

TEST_F(FirewallHealth, RulesThatDoNotFollowAPortAreNamed) {
    setMode("mode = drop");
    ASSERT_EQ(VELTFwRuleHup(), 0) << lastErrorSentence();
    storeFtp(2122, VELT_FTP_SERVICE_PLAIN);
    const Findings found = firewallFindings();
    EXPECT_EQ(summary(found), "error firewall-rules-differ");
    EXPECT_NE(found.at(0).sentence.find("2122, 55536-55899"), std::string::npos) << found.at(0).sentence;
}

void nft(const std::string& command) {
    const ProcessResult done = runProcess({"nft", "-f", "-"}, command + "\n");
    ASSERT_EQ(done.exitCode, 0) << done.errors;
}

TEST_F(FirewallHealth, AChainOfOthersThatDropsIsNamed) {
    for (const char* mode : {"mode = accept", "mode = off"}) {
        setMode(mode);
        ASSERT_EQ(VELTFwRuleHup(), 0) << lastErrorSentence();
        nft("add table inet other; add chain inet other input { type filter hook input priority 0; policy "
            "drop; }");
        const Findings found = firewallFindings();
        EXPECT_EQ(summary(found), "error firewall-foreign-drop") << mode;
        EXPECT_EQ(found.at(0).sentence, "The chain \"inet other input\" of another firewall closes ports of "
                                        "the file services: 2121, 55536-55899.");
        EXPECT_EQ(found.at(0).mend, "nft list chain inet other input");
        nft("add rule inet other input tcp dport { 2121, 55536-55899 } accept");
        EXPECT_EQ(firewallFindings(), Findings()) << mode;
        nft("delete table inet other");
    }
}

TEST_F(FirewallHealth, RulesThatWereChangedByHandAreNamed) {
    setMode("mode = drop");
    ASSERT_EQ(VELTFwRuleHup(), 0) << lastErrorSentence();
    for (const char* change :
         {"insert rule inet velt_fileserv input tcp dport 2121 drop", "flush chain inet velt_fileserv logins",
          "delete element inet velt_fileserv tcp_login { 2121 }",
          "insert rule inet velt_fileserv input accept"}) {
        EXPECT_EQ(firewallFindings(), Findings()) << change;
        nft(change);
        const Findings found = firewallFindings();
        EXPECT_EQ(summary(found), "error firewall-rules-changed") << change;
        EXPECT_EQ(found.at(0).mend, "Restart veltd.");
        ASSERT_EQ(VELTFwRuleHup(), 0) << lastErrorSentence();
    }
    EXPECT_EQ(firewallFindings(), Findings());
}

TEST_F(FirewallHealth, BansAndTheTablesOfOthersAreNoChange) {
    setMode("mode = drop");
    ASSERT_EQ(VELTFwRuleHup(), 0) << lastErrorSentence();
    nft("add element inet velt_fileserv banned4 { 192.0.2.7 timeout 60s }");
    EXPECT_EQ(firewallFindings(), Findings());
    nft("add table inet other; add chain inet other input { type filter hook input priority 0; }");
    EXPECT_EQ(firewallFindings(), Findings());
}

TEST(TableReading, TakesWhatNftLists) {
    const auto table = readTable(
        R"({"nftables": [{"metainfo": {}}, {"table": {"name": "velt_fileserv"}},
            {"set": {"name": "tcp_open", "elem": [22, {"range": [8000, 8010]}, "nonsense", {"range": [1]}]}},
            {"set": {"name": "tcp_login", "elem": [21]}}, {"chain": {"name": "logins"}},
            {"chain": {"name": "input", "policy": "drop"}}]})");
    ASSERT_TRUE(table);
    EXPECT_TRUE(table->drops);
    ASSERT_EQ(table->openPorts.size(), 2U);
    EXPECT_EQ(table->openPorts[1].last, 8010);
    for (const char* other : {"", "[]", "{}", R"({"nftables": 5})", R"({"nftables": [7, {"chain": []}]})"}) {
        EXPECT_FALSE(readTable(other)) << other;
    }
}

TEST(TableReading, JoinsWhatTouches) {
    const auto joined = joinedRanges({{50, 60}, {1, 1}, {2, 5}, {55, 70}, {100, 100}});
    ASSERT_EQ(joined.size(), 3U);
    EXPECT_EQ(joined[0].last, 5);
    EXPECT_EQ(joined[1].first, 50);
    EXPECT_EQ(joined[1].last, 70);
}

} // namespace
} // namespace velt::test
