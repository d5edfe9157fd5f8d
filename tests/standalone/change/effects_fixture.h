// Changes over real processes, the effects of which fail, or end the process, as a test wishes.
#ifndef VELT_TESTS_STANDALONE_CHANGE_EFFECTS_FIXTURE_H
#define VELT_TESTS_STANDALONE_CHANGE_EFFECTS_FIXTURE_H

#include "platform/adminlog.h"
#include "platform/core.h"
#include "platform/firewall.h"
#include "platform/sysevent.h"
#include "standalone/change/settings_change.h"
#include "standalone/control/service_firewall.h"
#include "standalone/core/paths.h"
#include "standalone/journal/admin_log.h"
#include "standalone/rules/rule_store.h"
#include "tests/standalone/control/services_fixture.h"

#include <unistd.h>

#include <csignal>
#include <filesystem>
#include <map>
#include <set>
#include <string>
#include <vector>

namespace velt::test {

inline constexpr unsigned anEvent = 0x11B00035;
inline constexpr const char* refusal = "Refused by the test.";

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

class EffectsOfChanges : public ServicesTest {
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
        killing_ = 0;
        seen_.clear();
        setEffectHook([this](Effect effect, std::string_view subject) { return decide(effect, subject); });
    }

    /// Has these fail, and ends the process before this one of the effects to come.
    void killAt(int effect, std::set<int> failing = {}) {
        failThe(std::move(failing));
        killing_ = effect;
    }

    EffectDecision decide(Effect effect, std::string_view subject) {
        seen_.push_back(std::string(effectName(effect)) + " " + std::string(subject));
        if (static_cast<int>(seen_.size()) == killing_) {
            ::kill(::getpid(), SIGKILL);
        }
        const bool fails = (effect == Effect::firewall && firewallFails_) || seen_.back() == lasting_;
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
        const ChangeOutcome outcome = (*change)->commit(policy_);
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
        // Sessions that are kept may be told to lose their passive ports.
        EXPECT_TRUE(made.warnings.empty() || policy_ == SessionPolicy::keep) << made.warnings.front();
    }

    Wanted little() const { return {firstPort_, 0, true, false, secondPort_}; }
    Wanted much() const {
        return {thirdPort_, 7, true, true, secondPort_, "192.0.2.7", {{true, 1000, "/home"}}};
    }

    const std::vector<std::string>& seen() const { return seen_; } ///< the effects since failThe or killAt

    bool firewallFails_ = false; ///< each time
    std::string lasting_;        ///< the effect that does
    SessionPolicy policy_ = SessionPolicy::byChange;

private:
    const int firstPort_ = ftpPort_;
    const int secondPort_ = sftpPort_;
    const int thirdPort_ = freePort();
    std::set<int> failing_;
    int killing_ = 0;
    std::vector<std::string> seen_;
    std::string openInFirewall_;
};

} // namespace velt::test

#endif
