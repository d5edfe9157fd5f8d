// What health says of the packet filter around real daemons, and with the command that mends it, which the
// test runs.
#include "tests/support/text.h"
#include "tests/system/support/health_service.h"

namespace velt::test {
namespace {

const std::string firewallFile = worldRoot / "etc/velt/firewall.conf";

class HostFirewallHealth : public HealthService {
protected:
    void TearDown() override {
        HealthService::TearDown();
        if (whyNoWorld().empty()) {
            runProcess({"nft", "flush", "ruleset"});
        }
    }
};

TEST_F(HostFirewallHealth, AFirewallThatDoesNotFollowIsFound) {
    setFirewall("mode = drop\nports = 22\n");
    done({"ftp", "set", "enable_ftp=on"});
    EXPECT_EQ(diagnosis(), "");
    setFirewall("mode = drop\nports = 22,443\n");
    const ProcessResult move = veltctl({"ftp", "set", "portnum=2131"});
    EXPECT_NE(move.exitCode, 0) << "nobody could reach the new port";
    EXPECT_TRUE(contains(move.errors, firewallFile + ", line 3")) << move.errors;
    EXPECT_EQ(fetchHome(), "alice");
    std::string found = diagnosis();
    EXPECT_EQ(found, "firewall-settings-damaged: Correct the file, then restart veltd.\n");
    ASSERT_EQ(runProcess({"nft", "flush", "ruleset"}).exitCode, 0);
    EXPECT_NE(diagnosis(), "");
    const std::string words = veltctl({"doctor"}).output;
    EXPECT_TRUE(contains(words, "No rules of this system are in force")) << words;
    setFirewall("mode = drop\nports = 22 443\n");
    mend(found, "firewall-settings-damaged");
    EXPECT_EQ(diagnosis(), "");
    ASSERT_EQ(runProcess({"nft", "flush", "ruleset"}).exitCode, 0);
    found = diagnosis();
    EXPECT_EQ(found, "firewall-rules-missing: Restart veltd.\n");
    mend(found, "firewall-rules-missing");
    ASSERT_EQ(runProcess({"nft", "add table inet other; add chain inet other input { type filter hook input "
                                 "priority 0; policy drop; }; add rule inet other input iif lo accept"})
                  .exitCode,
              0);
    found = diagnosis();
    EXPECT_EQ(found, "firewall-foreign-drop: nft list chain inet other input\n");
    mend(found, "firewall-foreign-drop"); // shows whose chain it is
    ASSERT_EQ(runProcess({"nft", "delete table inet other"}).exitCode, 0);
    EXPECT_EQ(diagnosis(), "");
}

TEST_F(HostFirewallHealth, RulesThatWereChangedByHandAreLoadedAgain) {
    setFirewall("mode = accept\n");
    EXPECT_EQ(stopHost(), 0);
    startHost();
    done({"ftp", "set", "enable_ftp=on"});
    EXPECT_EQ(diagnosis(), "");
    ASSERT_EQ(runProcess({"nft", "insert rule inet velt_fileserv input tcp dport 2121 drop"}).exitCode, 0);
    const std::string found = diagnosis();
    EXPECT_EQ(found, "firewall-rules-changed: Restart veltd.\n");
    mend(found, "firewall-rules-changed");
    EXPECT_EQ(fetchHome(), "alice");
    EXPECT_EQ(diagnosis(), "");
}

TEST_F(HostFirewallHealth, RulesThatLockTheAdministratorOutAreNotLoaded) {
    const NamedListener ssh("sshd", 2022);
    done({"ftp", "set", "enable_ftp=on"});
    setFirewall("mode = drop\nports = 22\n");
    EXPECT_EQ(stopHost(), 0);
    startHost();
    std::string found = diagnosis();
    EXPECT_EQ(found, "firewall-locks-out: Add 2022 to \"ports\" in " + firewallFile +
                         ", then restart veltd.\n"
                         "firewall-rules-missing: Restart veltd.\n");
    const ProcessResult move = veltctl({"ftp", "set", "portnum=2131"});
    EXPECT_NE(move.exitCode, 0);
    EXPECT_TRUE(contains(move.errors, "they would close port 2022, by which sshd is reached")) << move.errors;
    setFirewall("mode = drop\nports = 22 2022\n");
    mend(found, "firewall-locks-out");
    EXPECT_EQ(diagnosis(), "");
    EXPECT_EQ(runProcess({"nft", "list", "table", "inet", "velt_fileserv"}).exitCode, 0);
}

} // namespace
} // namespace velt::test
