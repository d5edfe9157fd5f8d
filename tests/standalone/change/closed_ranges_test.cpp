// A passive range that is given up while sessions use it.
#include "tests/standalone/change/effects_fixture.h"

namespace velt::test {
namespace {

using Lines = std::vector<std::string>;

class ClosedRanges : public EffectsOfChanges {
protected:
    void SetUp() override {
        EffectsOfChanges::SetUp();
        reach(little());
    }

    /// What the plan of another range warns of, and then the change to it.
    Lines warningsOfAnotherRange(SessionPolicy policy = SessionPolicy::byChange) {
        const Lines planned = warningsOf(policy, true);
        EXPECT_EQ(warningsOf(policy, false), planned);
        return planned;
    }

private:
    static Lines warningsOf(SessionPolicy policy, bool dryRun) {
        const auto change = SettingsChange::begin({});
        EXPECT_TRUE(change) << messageOf(change);
        _tag_VELT_FTP_CONF_ record{};
        EXPECT_EQ(VELTFTPConfGet(&record), 0);
        record.passive_port_min = 3000;
        record.passive_port_max = 3010;
        EXPECT_TRUE(VELTFTPConfSet(record) == 0 && VLIBServicectlStop("ftpd", 0) == 0 &&
                    VLIBServicectlStart("ftpd", 0) == 0)
            << lastErrorSentence();
        if (dryRun) {
            const auto plan = (*change)->plan(policy);
            EXPECT_TRUE(plan) << messageOf(plan);
            return plan ? plan->warnings : Lines();
        }
        const ChangeOutcome outcome = (*change)->commit(policy);
        EXPECT_FALSE(outcome.failure);
        return outcome.warnings;
    }
};

TEST_F(ClosedRanges, AreToldOfSessionsThatGoOn) {
    Client client(ftpPort_);
    ASSERT_TRUE(client.isServed());
    EXPECT_EQ(warningsOfAnotherRange(), Lines{"1 open session of FTP keeps the passive ports 55536-55899, "
                                              "which the firewall closes: its next transfers fail."});
    EXPECT_TRUE(client.isServed());
}

TEST_F(ClosedRanges, AreNothingToWhoeverIsNotThere) {
    EXPECT_EQ(warningsOfAnotherRange(), Lines());
}

TEST_F(ClosedRanges, AreNothingToSessionsThatEnd) {
    Client client(ftpPort_);
    ASSERT_TRUE(client.isServed());
    EXPECT_EQ(warningsOfAnotherRange(SessionPolicy::end), Lines());
    EXPECT_FALSE(client.isServed());
}

TEST_F(ClosedRanges, StayOpenWhereTheFirewallClosesNothing) {
    ASSERT_TRUE(replaceFile(statePath(paths::firewallSettings), "version = 1\nmode = accept\n", 0644));
    Client client(ftpPort_);
    ASSERT_TRUE(client.isServed());
    EXPECT_EQ(warningsOfAnotherRange(), Lines());
}

} // namespace
} // namespace velt::test
