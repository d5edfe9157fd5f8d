// Changes as a whole, over real processes.
#include "standalone/change/settings_change.h"

#include "platform/adminlog.h"
#include "platform/firewall.h"
#include "platform/webapi.h"
#include "standalone/control/start_services.h"
#include "standalone/core/paths.h"
#include "standalone/journal/admin_log.h"
#include "standalone/rules/rule_store.h"
#include "standalone/settings/settings.h"
#include "tests/standalone/control/services_fixture.h"

#include <sys/wait.h>
#include <unistd.h>

#include <csignal>
#include <thread>

namespace velt::test {
namespace {

constexpr SessionPolicy usual = SessionPolicy::byChange;
constexpr unsigned anEvent = 0x11B00035;

std::string textOf(const ChangeSteps& steps) {
    std::string text;
    for (const ChangeStep& step : steps) {
        text += (text.empty() ? "" : "; ") + std::string(stepName(step.kind)) + " " + step.subject;
    }
    return text;
}

class SettingsChangeTest : public ServicesTest {
protected:
    void SetUp() override {
        ServicesTest::SetUp();
        ASSERT_EQ(messageOf(makeRulesFile()), "");
    }

    static std::unique_ptr<SettingsChange> begin(const IntendedPorts& ports = {}) {
        auto change = SettingsChange::begin(ports);
        EXPECT_TRUE(change) << messageOf(change);
        return change ? std::move(*change) : nullptr;
    }

    /// What a request for another upload rate does.
    void setRate(int rate) {
        storeFtp(plain, rate);
        for (const char* name : {"ftpd-pure", "ftpd-ssl", "ftpd"}) {
            EXPECT_EQ(VLIBServicectlStop(name, 0), 0) << lastErrorSentence();
        }
        EXPECT_EQ(VLIBServicecfgRunKeySet("ftpd", 2), 0);
        EXPECT_EQ(VLIBServicectlStart("ftpd-pure", 0), 0) << lastErrorSentence();
        EXPECT_EQ(VLIBServicectlStart("ftpd", 0), 0) << lastErrorSentence();
        EXPECT_EQ(VLIBServicecfgRunKeySet("ftpd", 1), 0);
        EXPECT_EQ(VELTLogSet1(2, 1, anEvent, "1", "2", "", ""), 0);
    }

    static int storedRate() {
        const auto settings = loadFtpSettings();
        EXPECT_TRUE(settings) << messageOf(settings);
        return settings ? settings->record.maxuploadrate : -1;
    }
    static int otherThreadsRate() {
        int rate = -1;
        std::thread([&rate] { rate = storedRate(); }).join();
        return rate;
    }
    static std::size_t logEntries() {
        const auto entries = queryLog({});
        EXPECT_TRUE(entries) << messageOf(entries);
        return entries.valueOr({}).size();
    }
};

TEST_F(SettingsChangeTest, NobodySeesItBeforeItIsCommitted) {
    ASSERT_EQ(VLIBServicectlStart("ftpd", 0), 0) << lastErrorSentence();
    const ProcessId daemon = daemonOf("ftpd");
    {
        const auto change = begin();
        setRate(7);
        EXPECT_EQ(storedRate(), 7);
        EXPECT_EQ(otherThreadsRate(), 0);
        const auto plan = change->plan(usual);
        ASSERT_TRUE(plan);
        EXPECT_EQ(textOf(plan->steps),
                  "store ftp settings; store run key of ftpd; hand over ftp; log The SFTP "
                  "port was changed from 1 to 2.");
    }
    EXPECT_EQ(storedRate(), 0);
    EXPECT_EQ(daemonOf("ftpd"), daemon);
    EXPECT_EQ(runKey("ftpd"), "none");
    EXPECT_EQ(logEntries(), 0U);
}

TEST_F(SettingsChangeTest, ACommitDoesWhatThePlanSaid) {
    ASSERT_EQ(VLIBServicectlStart("ftpd", 0), 0) << lastErrorSentence();
    const ProcessId daemon = daemonOf("ftpd");
    const auto change = begin();
    setRate(7);
    const auto plan = change->plan(usual);
    ASSERT_TRUE(plan);
    const auto outcome = change->commit(usual);
    ASSERT_FALSE(outcome.failure) << outcome.failure->message;
    EXPECT_EQ(textOf(outcome.steps), textOf(plan->steps));
    EXPECT_EQ(otherThreadsRate(), 7);
    EXPECT_NE(daemonOf("ftpd"), daemon);
    EXPECT_TRUE(accepts(ftpPort_));
    EXPECT_EQ(runKey("ftpd"), "1\n");
    EXPECT_EQ(logEntries(), 1U);
    EXPECT_FALSE(fileExists(statePath(paths::unfinishedChange)));
}

TEST_F(SettingsChangeTest, ADaemonThatRunsAsWantedIsNotHandedOver) {
    ASSERT_EQ(VLIBServicectlStart("ftpd", 0), 0) << lastErrorSentence();
    const ProcessId daemon = daemonOf("ftpd");
    const std::string stored = "store run key of ftpd; ";
    const std::string logged = "log The SFTP port was changed from 1 to 2.";
    Client client(ftpPort_);
    ASSERT_TRUE(client.isServed());
    const std::pair<SessionPolicy, std::string> cases[]{{usual, ""},
                                                        {SessionPolicy::end, "end sessions ftp; "}};
    for (const auto& [policy, ends] : cases) {
        const auto change = begin();
        setRate(0);
        const auto plan = change->plan(policy);
        ASSERT_TRUE(plan);
        EXPECT_EQ(textOf(plan->steps), (policy == usual ? stored : "") + ends + logged);
        const auto outcome = change->commit(policy);
        ASSERT_FALSE(outcome.failure) << outcome.failure->message;
        EXPECT_EQ(textOf(outcome.steps), textOf(plan->steps));
        EXPECT_EQ(daemonOf("ftpd"), daemon);
        EXPECT_EQ(client.isServed(), policy == usual);
    }
}

TEST_F(SettingsChangeTest, WhatIsOffIsNotStoppedOnceMore) {
    storeFtp(0);
    const auto change = begin();
    storeFtp(0, 7);
    ASSERT_EQ(VLIBServicectlStop("ftpd", 0), 0) << lastErrorSentence();
    const auto plan = change->plan(SessionPolicy::end);
    ASSERT_TRUE(plan);
    EXPECT_EQ(textOf(plan->steps), "store ftp settings");
}

TEST_F(SettingsChangeTest, WhatIsSwitchedOffKeepsItsSessionsWhereAsked) {
    ASSERT_EQ(VLIBServicectlStart("ftpd", 0), 0) << lastErrorSentence();
    Client client(ftpPort_);
    ASSERT_TRUE(client.isServed());
    const auto switchOff = [&](SessionPolicy policy, int rate) {
        const auto change = begin();
        storeFtp(0, rate);
        EXPECT_EQ(VLIBServicectlStop("ftpd", 0), 0) << lastErrorSentence();
        const auto plan = change->plan(policy);
        EXPECT_TRUE(plan) << messageOf(plan);
        const auto outcome = change->commit(policy);
        EXPECT_FALSE(outcome.failure);
        EXPECT_EQ(textOf(outcome.steps), plan ? textOf(plan->steps) : "");
        EXPECT_EQ(outcome.sessionsEnded, plan ? plan->sessionsEnded : -1);
        return textOf(outcome.steps) + ", ends " + std::to_string(outcome.sessionsEnded);
    };
    EXPECT_EQ(switchOff(SessionPolicy::keep, 0), "store ftp settings; close ftp; close port " +
                                                     std::to_string(ftpPort_) +
                                                     "; close port 55536-55899, ends 0");
    EXPECT_FALSE(accepts(ftpPort_));
    EXPECT_EQ(switchOff(usual, 7), "store ftp settings, ends 0") << "a change that takes nothing away";
    EXPECT_EQ(messageOf(startEnabledServices()), "") << "as the next veltd does";
    EXPECT_TRUE(client.isServed());
    EXPECT_EQ(switchOff(SessionPolicy::end, 8), "store ftp settings; end sessions ftp, ends 1");
    EXPECT_FALSE(client.isServed());
}

TEST_F(SettingsChangeTest, SessionsThatWereKeptAreBackWithTheirServiceWhenTheChangeFails) {
    ASSERT_EQ(VLIBServicectlStart("ftpd", 0), 0) << lastErrorSentence();
    Client client(ftpPort_);
    ASSERT_TRUE(client.isServed());
    const auto change = begin();
    storeFtp(0);
    ASSERT_EQ(VLIBServicectlStop("ftpd", 0), 0) << lastErrorSentence();
    storeSftp(true);
    ASSERT_EQ(VLIBServiceStart("sftp", 0), 0) << lastErrorSentence();
    planDouble().sftpOptions = {"--refuse", "fatal: no luck"};
    const auto outcome = change->commit(SessionPolicy::keep);
    ASSERT_TRUE(outcome.failure);
    EXPECT_TRUE(outcome.undone);
    EXPECT_TRUE(accepts(ftpPort_));
    EXPECT_TRUE(client.isServed());
}

TEST_F(SettingsChangeTest, ALostFileOfRulesIsNotPlannedAnew) {
    std::filesystem::remove(statePath(paths::chrootRules));
    const auto change = begin();
    setRate(7);
    const auto plan = change->plan(usual);
    ASSERT_TRUE(plan);
    const std::string steps = textOf(plan->steps);
    EXPECT_NE(steps.find("start ftp"), std::string::npos) << steps;
    EXPECT_EQ(steps.find("chroot rules"), std::string::npos) << "no start makes it: " << steps;
}

TEST_F(SettingsChangeTest, NothingAskedIsNothingDone) {
    const auto change = begin();
    const auto outcome = change->commit(usual);
    EXPECT_FALSE(outcome.failure);
    EXPECT_TRUE(outcome.steps.empty()) << textOf(outcome.steps);
}

TEST_F(SettingsChangeTest, AStartThatFailsTakesAllBack) {
    ASSERT_EQ(VLIBServicectlStart("ftpd", 0), 0) << lastErrorSentence();
    planDouble().crashingRate = 7;
    const auto change = begin();
    storeSftp(true);
    EXPECT_EQ(VLIBServiceStart("sftp", 0), 0) << lastErrorSentence();
    setRate(7);
    const auto outcome = change->commit(usual);
    ASSERT_TRUE(outcome.failure);
    EXPECT_EQ(outcome.failure->message, "The FTP daemon does not start: fatal: out of luck.");
    EXPECT_TRUE(outcome.undone);
    EXPECT_TRUE(outcome.steps.empty());
    EXPECT_EQ(storedRate(), 0);
    EXPECT_TRUE(accepts(ftpPort_)) << "the former daemon serves again";
    EXPECT_FALSE(accepts(sftpPort_)) << "what was started is stopped";
    EXPECT_EQ(runKey("ftpd"), "none");
    EXPECT_EQ(logEntries(), 0U);
    EXPECT_FALSE(fileExists(statePath(paths::unfinishedChange)));
}

TEST_F(SettingsChangeTest, WhatCannotBeSetBackIsSaid) {
    ASSERT_EQ(VLIBServicectlStart("ftpd", 0), 0) << lastErrorSentence();
    const auto change = begin();
    setRate(7);
    planDouble().ftpOptions = {"--refuse", "fatal: no luck at all"};
    const auto outcome = change->commit(usual);
    ASSERT_TRUE(outcome.failure);
    EXPECT_EQ(
        outcome.failure->message,
        "The FTP daemon does not start: fatal: no luck at all. Not all could be set back to what it was: "
        "The FTP daemon does not start: fatal: no luck at all.");
    EXPECT_FALSE(outcome.undone);
    EXPECT_EQ(storedRate(), 0) << "the settings are";
}

TEST_F(SettingsChangeTest, AStartThatWouldFailFailsAtOnce) {
    const auto change = begin();
    storeFtp(plain, 7);
    const Listener other(ftpPort_);
    EXPECT_LT(VLIBServicectlStart("ftpd", 0), 0);
    EXPECT_NE(lastErrorSentence().find("process " + std::to_string(::getpid())), std::string::npos)
        << lastErrorSentence();
    storeSftp(true);
    planDouble().refuse = true;
    EXPECT_LT(VLIBServiceStart("sftp", 0), 0);
    EXPECT_EQ(lastErrorSentence(), "The configuration was refused.");
}

TEST_F(SettingsChangeTest, PortsThatChangeHandsAreOpenedAndClosed) {
    const int former = ftpPort_;
    ftpPort_ = freePort();
    const auto change = begin();
    setRate(0);
    EXPECT_EQ(VELTFwRuleHup(), 0);
    const auto plan = change->plan(usual);
    ASSERT_TRUE(plan);
    EXPECT_NE(textOf(plan->steps)
                  .find("start ftp; close port " + std::to_string(former) + "; open port " +
                        std::to_string(ftpPort_) + "; log"),
              std::string::npos)
        << textOf(plan->steps);
}

TEST_F(SettingsChangeTest, TwoDaemonsExchangeTheirPorts) {
    storeSftp(true);
    ASSERT_EQ(VLIBServicectlStart("ftpd", 0), 0) << lastErrorSentence();
    ASSERT_EQ(VLIBServiceStart("sftp", 0), 0) << lastErrorSentence();
    std::swap(ftpPort_, sftpPort_);
    const auto change = begin({{{"ftp", ftpPort_}, {"sftp", sftpPort_}}, {}});
    EXPECT_EQ(WebUtils::IsPortConflict("ftp", ftpPort_, ftpPort_), 0) << lastErrorSentence();
    EXPECT_EQ(WebUtils::IsPortConflict("ssh", sftpPort_, sftpPort_), 0) << lastErrorSentence();
    setRate(0);
    storeSftp(true);
    EXPECT_EQ(VLIBServiceResume("sftp"), 0) << lastErrorSentence();
    const auto outcome = change->commit(usual);
    ASSERT_FALSE(outcome.failure) << outcome.failure->message;
    EXPECT_NE(textOf(outcome.steps).find("pause sftp; hand over ftp; start sftp"), std::string::npos)
        << textOf(outcome.steps);
    EXPECT_EQ(serviceState("ftpd").ports, std::vector<int>{ftpPort_});
    EXPECT_EQ(serviceState("sftp").ports, std::vector<int>{sftpPort_});
    EXPECT_TRUE(accepts(ftpPort_));
    EXPECT_TRUE(accepts(sftpPort_));
}

TEST_F(SettingsChangeTest, OneThatLeavesThePortGoesFirst) {
    storeSftp(true);
    ASSERT_EQ(VLIBServicectlStart("ftpd", 0), 0) << lastErrorSentence();
    ASSERT_EQ(VLIBServiceStart("sftp", 0), 0) << lastErrorSentence();
    ftpPort_ = std::exchange(sftpPort_, freePort());
    const auto change = begin({{{"ftp", ftpPort_}, {"sftp", sftpPort_}}, {}});
    setRate(0);
    storeSftp(true);
    EXPECT_EQ(VLIBServiceResume("sftp"), 0) << lastErrorSentence();
    const auto outcome = change->commit(usual);
    ASSERT_FALSE(outcome.failure) << outcome.failure->message;
    EXPECT_NE(textOf(outcome.steps).find("hand over sftp; hand over ftp"), std::string::npos)
        << textOf(outcome.steps);
    EXPECT_TRUE(accepts(ftpPort_));
    EXPECT_TRUE(accepts(sftpPort_));
}

TEST_F(SettingsChangeTest, APortOfAnotherProgramIsNotIntended) {
    const Listener other(ftpPort_);
    const auto change = begin({{{"ftp", ftpPort_}}, {{"ftp", {ftpPort_ - 1, ftpPort_ + 1}}}});
    EXPECT_NE(WebUtils::IsPortConflict("ftp", ftpPort_, ftpPort_), 0);
    EXPECT_NE(WebUtils::IsPortConflict("ftp", ftpPort_ - 1, ftpPort_ + 1), 0) << "nor within a range";
}

/// Runs the change in a child that is killed before the next effect after so many. False when there were
/// fewer.
bool isKilledAfter(int effects, const std::function<void()>& change) {
    const pid_t child = ::fork();
    if (child == 0) {
        int left = effects;
        setEffectHook([&left](Effect, std::string_view) -> EffectDecision {
            if (--left < 0) {
                ::kill(::getpid(), SIGKILL);
            }
            return std::nullopt;
        });
        change();
        ::_exit(0);
    }
    int status = 0;
    EXPECT_EQ(::waitpid(child, &status, 0), child);
    return WIFSIGNALED(status);
}

TEST_F(SettingsChangeTest, KilledAtAnyMomentItIsTheFormerOrTheNewOne) {
    ASSERT_EQ(VLIBServicectlStart("ftpd", 0), 0) << lastErrorSentence();
    int former = 0;
    bool killed = true;
    int kills = 0;
    for (int effects = 0; killed; ++effects) {
        const int wanted = 100 + effects;
        killed = isKilledAfter(effects, [&] {
            const auto change = begin();
            setRate(wanted);
            storeSftp(true);
            EXPECT_EQ(VLIBServiceStart("sftp", 0), 0);
            (void)change->commit(usual);
        });
        kills += killed ? 1 : 0;
        const auto undone = undoUnfinishedChange();
        ASSERT_TRUE(undone) << messageOf(undone);
        const auto sftp = loadSftpSettings();
        ASSERT_TRUE(sftp);
        const bool isNew = storedRate() == wanted;
        EXPECT_EQ(storedRate(), isNew ? wanted : former);
        EXPECT_EQ(sftp->enabled, isNew) << "after " << effects;
        EXPECT_EQ(runKey("sftp"), isNew ? "1\n" : "none");
        EXPECT_FALSE(fileExists(statePath(paths::unfinishedChange)));
        ASSERT_TRUE(startEnabledServices());
        EXPECT_TRUE(accepts(ftpPort_));
        EXPECT_EQ(accepts(sftpPort_), isNew);
        EXPECT_EQ(serviceState("ftpd").configurationHash,
                  std::to_string(ftpPort_) + " 1 " + std::to_string(isNew ? wanted : former));
        if (isNew) {
            former = wanted;
            storeSftp(false);
            EXPECT_EQ(VLIBServiceStop("sftp", 0), 0);
            std::filesystem::remove_all(statePath("/etc/velt/run-keys"));
        }
    }
    EXPECT_GE(kills, 16) << "each store, staged and real, each start and each entry is such a moment";
}

} // namespace
} // namespace velt::test
