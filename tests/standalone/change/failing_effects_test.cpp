// Changes of which each effect fails once, over real processes: all of it is done, or nothing.
#include "standalone/control/start_services.h"
#include "standalone/health/checks.h"
#include "tests/standalone/change/effects_fixture.h"

#include <algorithm>

namespace velt::test {
namespace {

class FailingEffects : public EffectsOfChanges {
protected:
    /// Lets each effect of the change fail once. Returns which ones there were.
    std::vector<std::string> failEachOnce(const Wanted& from, const Wanted& to) {
        reach(from); // once there and back, since there are files that no change removes
        reach(to);
        const std::vector<std::string> effects = seen();
        const Everything after = everything();
        reach(from);
        const Everything before = everything();
        for (int n = 1; n <= static_cast<int>(effects.size()); ++n) {
            const std::string& effect = effects[static_cast<std::size_t>(n) - 1];
            const testing::ScopedTrace trace(__FILE__, __LINE__, effect);
            const std::size_t entries = logEntries();
            failThe({n});
            const Attempt made = attempt(to);
            EXPECT_EQ(seen().at(static_cast<std::size_t>(n) - 1), effect);
            failThe({});
            EXPECT_TRUE(made.undone);
            expectSame(everything(), made.done ? after : before);
            EXPECT_EQ(changeFindings(), Findings());
            if (made.done) {
                tolerated_.insert(effect);
                warned_ += made.warnings == std::vector<std::string>{refusal} ? 1 : 0;
                reach(from);
            } else {
                EXPECT_EQ(made.failure, refusal);
                EXPECT_EQ(logEntries(), entries) << "what was not done is not in the log";
            }
        }
        return effects;
    }

    /// The same for each effect of undoing a change of which the last step failed.
    void failEachUndoing(const Wanted& from, const Wanted& to) {
        reach(from);
        reach(to);
        const auto note = std::ranges::find(seen().rbegin(), seen().rend(), "store note of the change");
        ASSERT_NE(note, seen().rend());
        const int last = static_cast<int>(seen().rend() - note); // the change forgets its note
        reach(from);
        failThe({last});
        ASSERT_FALSE(attempt(to).done);
        const int end = static_cast<int>(seen().size());
        ASSERT_GT(end, last + 5) << "each file, each daemon, the note";
        for (int n = last + 1; n <= end; ++n) {
            failThe({});
            ASSERT_EQ(messageOf(undoUnfinishedChange()), "");
            reach(from);
            const auto before = everything();
            failThe({last, n});
            const Attempt made = attempt(to);
            const testing::ScopedTrace trace(__FILE__, __LINE__, seen().at(static_cast<std::size_t>(n - 1)));
            expectLoudOrWhole(made, before);
        }
    }

    void expectLoudOrWhole(const Attempt& made, const Everything& before) {
        EXPECT_FALSE(made.done);
        failThe({});
        if (made.undone) {
            expectSame(everything(), before);
            return;
        }
        ++loud_;
        EXPECT_EQ(made.failure,
                  std::string(refusal) + " Not all could be set back to what it was: " + refusal);
        const Findings found = changeFindings();
        ASSERT_EQ(found.size(), 1U);
        EXPECT_EQ(found.at(0).id, "change-half-undone");
        EXPECT_EQ(found.at(0).mend, "Restart veltd.");
        // What the next veltd does first.
        EXPECT_EQ(undoUnfinishedChange(), true);
        EXPECT_EQ(messageOf(startEnabledServices()), "");
        expectSame(everything(), before);
        EXPECT_EQ(changeFindings(), Findings());
    }

    std::set<std::string> tolerated_; ///< effects without which a change is done all the same
    int warned_ = 0;                  ///< and how often its answer warned of that
    int loud_ = 0;                    ///< undoings that failed, and said so
};

/// What can be made up for within the change, and what only tells of it.
const std::set<std::string> tolerated{"firewall firewall rules", "event velt.service.action",
                                      "log The SFTP port was changed from 1 to 2."};

TEST_F(FailingEffects, OnTheWayUpAllIsDoneOrNothing) {
    const auto effects = failEachOnce(little(), much());
    for (const char* each : {"store ftp settings", "store sftp settings", "store chroot rules",
                             "store system information", "store run key of sftp", "store note of the change",
                             "start ftpd", "start sftp", "firewall firewall rules",
                             "event velt.service.action", "log The SFTP port was changed from 1 to 2."}) {
        EXPECT_NE(std::ranges::find(effects, each), effects.end()) << each;
    }
    EXPECT_EQ(tolerated_, tolerated);
    EXPECT_EQ(warned_, 2) << "of the event and the entry that are missing";
}

TEST_F(FailingEffects, OnTheWayDownToo) {
    Wanted off = little();
    off.ftpOn = false;
    const auto effects = failEachOnce(much(), off);
    for (const char* each : {"stop ftpd", "stop sftp", "store run key of ftpd"}) {
        EXPECT_NE(std::ranges::find(effects, each), effects.end()) << each;
    }
    EXPECT_EQ(tolerated_, tolerated);
}

TEST_F(FailingEffects, AndWhereServicesExchangeTheirPorts) {
    Wanted exchanged = much();
    std::swap(exchanged.ftpPort, exchanged.sftpPort);
    failEachOnce(much(), exchanged);
    EXPECT_EQ(tolerated_, tolerated);
}

TEST_F(FailingEffects, APortThatTheFirewallDoesNotOpenTakesTheChangeBack) {
    reach(little());
    const Everything before = everything();
    firewallFails_ = true;
    const Attempt made = attempt(much());
    EXPECT_EQ(made.failure, refusal);
    EXPECT_TRUE(made.undone) << "the rules are those of before";
    expectSame(everything(), before);
    Wanted off = little();
    off.ftpOn = false;
    const Attempt closing = attempt(off);
    EXPECT_TRUE(closing.done) << "what is off need not be closed";
    EXPECT_EQ(closing.warnings, std::vector<std::string>{refusal});
    ASSERT_TRUE(replaceFile(statePath(paths::firewallSettings), "version = 1\nmode = accept\n", 0644));
    EXPECT_TRUE(attempt(much()).done) << "the port is not closed without our rules";
}

TEST_F(FailingEffects, FirewallSettingsThatCannotBeUsedAreFoundByThePlan) {
    reach(little());
    const Everything before = everything();
    const std::string damaged = "version = 1\nmode = drop\nports = 22,443\n";
    ASSERT_TRUE(replaceFile(statePath(paths::firewallSettings), damaged, 0644));
    {
        const auto change = SettingsChange::begin({{{"ftp", much().ftpPort}}, {}});
        ASSERT_TRUE(change) << messageOf(change);
        ASSERT_TRUE(ask(much()));
        const auto plan = (*change)->plan(SessionPolicy::byChange);
        EXPECT_NE(messageOf(plan).find("firewall.conf"), std::string::npos) << messageOf(plan);
        const ChangeOutcome outcome = (*change)->commit(SessionPolicy::byChange);
        ASSERT_TRUE(outcome.failure);
        EXPECT_EQ(outcome.failure->message, messageOf(plan));
        EXPECT_TRUE(outcome.undone);
    }
    ftpPort_ = little().ftpPort;
    ASSERT_TRUE(
        replaceFile(statePath(paths::firewallSettings), "version = 1\nmode = drop\nforce = 1\n", 0644));
    expectSame(everything(), before);
}

// A full disk, a folder that cannot be written, a program that is broken: what failed fails again.
TEST_F(FailingEffects, AFaultThatLastsLeavesAllAsItWas) {
    Wanted next = much();
    next.rate = 9;
    next.sftpPort = little().ftpPort;
    next.rules.clear();
    reach(much());
    reach(next);
    const std::set<std::string> effects(seen().begin(), seen().end());
    EXPECT_TRUE(effects.contains("start ftpd") && effects.contains("start sftp"));
    reach(much());
    const Everything before = everything();
    const auto daemons = std::pair(daemonOf("ftpd"), daemonOf("sftp"));
    for (const std::string& effect : effects) {
        if (tolerated.contains(effect)) {
            continue;
        }
        const testing::ScopedTrace trace(__FILE__, __LINE__, effect);
        lasting_ = effect;
        failThe({});
        const Attempt made = attempt(next);
        EXPECT_FALSE(made.done);
        EXPECT_TRUE(made.undone) << made.failure;
        EXPECT_EQ(made.failure, refusal);
        lasting_ = "";
        expectSame(everything(), before);
        EXPECT_EQ(changeFindings(), Findings());
        EXPECT_TRUE(effect != "start ftpd" || daemonOf("ftpd") == daemons.first) << "it served all the time";
        EXPECT_TRUE(effect != "start sftp" || daemonOf("sftp") == daemons.second);
        reach(much());
    }
}

TEST_F(FailingEffects, AnUndoingThatFailsIsSaidAndMadeUpFor) {
    failEachUndoing(little(), much());
    EXPECT_GE(loud_, 8) << "each file, each daemon";
}

} // namespace
} // namespace velt::test
