// Changes of which each effect fails once, over real processes: all of it is done, or nothing.
#include "standalone/change/settings_change.h"

#include "platform/adminlog.h"
#include "platform/core.h"
#include "platform/firewall.h"
#include "platform/sysevent.h"
#include "standalone/control/service_firewall.h"
#include "standalone/control/start_services.h"
#include "standalone/core/paths.h"
#include "standalone/health/checks.h"
#include "standalone/journal/admin_log.h"
#include "standalone/rules/rule_store.h"
#include "tests/standalone/control/services_fixture.h"

#include <algorithm>
#include <filesystem>
#include <map>
#include <set>
#include <vector>

namespace velt::test {
namespace {

constexpr unsigned anEvent = 0x11B00035;
constexpr const char* refusal = "Refused by the test.";

/// The settings that a change is to lead to.
struct Wanted {
    int ftpPort = 0;
    int rate = 0;
    bool ftpOn = true;
    bool sftpOn = false;
    int sftpPort = 0;
    const char* address = "192.0.2.1";
    std::vector<ChrootRule> rules{};
};

/// What a change may touch, by name.
using Everything = std::map<std::string, std::string>;

/// What became of a change, in which phase it ended.
struct Attempt {
    bool done = false;
    bool undone = true;
    std::string failure;
    std::vector<std::string> warnings;
};

class FailingEffects : public ServicesTest {
protected:
    /// The rules of the packet filter are the one thing that is not real: nothing of this machine is touched.
    void SetUp() override {
        ServicesTest::SetUp();
        failThe({});
        planDouble().ftpOptions = {"--share"};
        planDouble().sftpOptions = {"--share"};
        ASSERT_TRUE(
            replaceFile(statePath(paths::firewallSettings), "version = 1\nmode = drop\nforce = 1\n", 0644));
    }

    void TearDown() override {
        ASSERT_TRUE(replaceFile(statePath(paths::firewallSettings), "version = 1\nmode = off\n", 0644));
        ServicesTest::TearDown();
    }

    /// Has these of the effects to come fail, counted from 1.
    void failThe(std::set<int> effects) {
        failing_ = std::move(effects);
        seen_.clear();
        setEffectHook([this](Effect effect, std::string_view subject) { return decide(effect, subject); });
    }

    EffectDecision decide(Effect effect, std::string_view subject) {
        seen_.push_back(std::string(effectName(effect)) + " " + std::string(subject));
        const bool fails = effect == Effect::firewall && firewallFails_;
        if (fails || failing_.contains(static_cast<int>(seen_.size()))) {
            return Error(ErrorNumber::store, refusal);
        }
        if (effect != Effect::firewall) {
            return std::nullopt;
        }
        const auto needs = firewallNeeds();
        EXPECT_TRUE(needs) << messageOf(needs);
        openInFirewall_.clear();
        for (const auto& range : needs ? needs->openPorts : std::vector<VELT_FTP_PORT_RANGE>()) {
            openInFirewall_ += std::to_string(range.first) + " ";
        }
        return Result<>();
    }

    /// What the framework's calls of a request are. False when one of them is refused.
    bool ask(const Wanted& wanted) {
        ftpPort_ = wanted.ftpPort;
        sftpPort_ = wanted.sftpPort;
        _tag_VELT_FTP_CONF_ record{};
        _tag_VELT_SFTP_CONFIG_ sftpRecord{};
        bool good = VELTFTPConfGet(&record) == 0 && VELTSFTPConfigGet(1, &sftpRecord) == 0;
        std::snprintf(record.portnum, sizeof record.portnum, "%d", wanted.ftpPort);
        record.service_flags = wanted.ftpOn ? plain : 0;
        record.maxuploadrate = wanted.rate;
        good = good && VELTFTPConfSet(record) == 0 &&
               VLIBCINFOSetKeyValue("ftp_ext_ip", wanted.address) == 0 && storeRules(wanted.rules) &&
               VELTSFTPConfigSet(wanted.sftpOn ? 1 : 0, wanted.sftpPort) == 0 && VELTFwRuleHup() == 0 &&
               VLIBServicectlStop("ftpd", 0) == 0 && VLIBServicecfgRunKeySet("ftpd", 2) == 0;
        if (good && wanted.ftpOn) {
            good = VLIBServicectlStart("ftpd", 0) == 0 && VLIBServicecfgRunKeySet("ftpd", 1) == 0;
        }
        good = good && (wanted.sftpOn ? VLIBServiceStart("sftp", 0) : VLIBServiceStop("sftp", 0)) == 0;
        return good && VLIBSyseventEmit("velt.service.action", nullptr, 0) == 0 &&
               VELTLogSet1(2, 1, anEvent, "1", "2", "", "") == 0;
    }

    Attempt attempt(const Wanted& wanted) {
        auto change = SettingsChange::begin({{{"ftp", wanted.ftpPort}, {"sftp", wanted.sftpPort}}, {}});
        if (!change) {
            return {false, true, change.error().message, {}};
        }
        if (!ask(wanted)) {
            return {false, true, lastErrorSentence(), {}};
        }
        const ChangeOutcome outcome = (*change)->commit(SessionPolicy::byChange);
        return {!outcome.failure, outcome.undone, outcome.failure ? outcome.failure->message : "",
                outcome.warnings};
    }

    /// Everything that a change may touch, but for the journal.
    Everything everything() const {
        Everything all;
        for (const auto& entry : std::filesystem::recursive_directory_iterator(root_ / "etc")) {
            if (entry.is_regular_file()) {
                all[entry.path().string()] = readFile(entry.path()).valueOr("unreadable");
            }
        }
        for (const char* service : {"ftpd", "sftp"}) {
            const DaemonState state = serviceState(service);
            std::string& text = all[service];
            text = std::to_string(static_cast<int>(state.state)) + " " + state.configurationHash;
            for (const int port : state.ports) {
                text += " " + std::to_string(port) + (accepts(port) ? " accepts" : " refuses");
            }
        }
        all["firewall"] = openInFirewall_;
        all["note"] = readFile(statePath(paths::unfinishedChange)).valueOr("none");
        return all;
    }

    static void expectSame(const Everything& now, const Everything& expected) {
        for (const auto& [name, contents] : expected) {
            EXPECT_TRUE(now.contains(name)) << name;
            EXPECT_EQ(now.contains(name) ? now.at(name) : "", contents) << name;
        }
        for (const auto& [name, contents] : now) {
            EXPECT_TRUE(expected.contains(name)) << name;
        }
    }

    static std::size_t logEntries() {
        const auto entries = queryLog({});
        EXPECT_TRUE(entries) << messageOf(entries);
        return entries.valueOr({}).size();
    }

    void reach(const Wanted& wanted) {
        failThe({});
        const Attempt made = attempt(wanted);
        ASSERT_TRUE(made.done) << made.failure;
        EXPECT_EQ(made.warnings, std::vector<std::string>());
    }

    /// Lets each effect of the change fail once. Returns which ones there were.
    std::vector<std::string> failEachOnce(const Wanted& from, const Wanted& to) {
        reach(from); // once there and back, since there are files that no change removes
        reach(to);
        const std::vector<std::string> effects = seen_;
        const Everything after = everything();
        reach(from);
        const Everything before = everything();
        for (int n = 1; n <= static_cast<int>(effects.size()); ++n) {
            const std::string& effect = effects[static_cast<std::size_t>(n) - 1];
            const testing::ScopedTrace trace(__FILE__, __LINE__, effect);
            const std::size_t entries = logEntries();
            failThe({n});
            const Attempt made = attempt(to);
            EXPECT_EQ(seen_.at(static_cast<std::size_t>(n) - 1), effect);
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
        const auto note = std::ranges::find(seen_.rbegin(), seen_.rend(), "store note of the change");
        ASSERT_NE(note, seen_.rend());
        const int last = static_cast<int>(seen_.rend() - note); // the change forgets its note
        reach(from);
        failThe({last});
        ASSERT_FALSE(attempt(to).done);
        const int end = static_cast<int>(seen_.size());
        ASSERT_GT(end, last + 5) << "each file, each daemon, the note";
        for (int n = last + 1; n <= end; ++n) {
            failThe({});
            ASSERT_EQ(messageOf(undoUnfinishedChange()), "");
            reach(from);
            const auto before = everything();
            failThe({last, n});
            const Attempt made = attempt(to);
            const testing::ScopedTrace trace(__FILE__, __LINE__, seen_.at(static_cast<std::size_t>(n - 1)));
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
        EXPECT_EQ(found.at(0).mend, "systemctl restart veltd");
        // What the next veltd does first.
        EXPECT_EQ(undoUnfinishedChange(), true);
        EXPECT_EQ(messageOf(startEnabledServices()), "");
        expectSame(everything(), before);
        EXPECT_EQ(changeFindings(), Findings());
    }

    Wanted little() const { return {firstPort_, 0, true, false, secondPort_}; }
    Wanted much() const {
        return {thirdPort_, 7, true, true, secondPort_, "192.0.2.7", {{true, 1000, "/home"}}};
    }

    std::set<std::string> tolerated_; ///< effects without which a change is done all the same
    int warned_ = 0;                  ///< and how often its answer warned of that
    bool firewallFails_ = false;      ///< each time
    int loud_ = 0;                    ///< undoings that failed, and said so

private:
    const int firstPort_ = ftpPort_;
    const int secondPort_ = sftpPort_;
    const int thirdPort_ = freePort();
    std::set<int> failing_;
    std::vector<std::string> seen_;
    std::string openInFirewall_;
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

TEST_F(FailingEffects, AnUndoingThatFailsIsSaidAndMadeUpFor) {
    failEachUndoing(little(), much());
    EXPECT_GE(loud_, 8) << "each file, each daemon";
}

} // namespace
} // namespace velt::test
