// Changes in which the process is killed before each effect in turn, over real processes: what the next one
// makes of them is the former state or the new one, whole, with the services accordingly.
#include "standalone/control/start_services.h"
#include "standalone/health/checks.h"
#include "tests/standalone/change/effects_fixture.h"

#include <sys/wait.h>

#include <algorithm>
#include <optional>

namespace velt::test {
namespace {

class KilledChanges : public EffectsOfChanges {
protected:
    /// What the next process does first.
    static void recover() {
        EXPECT_TRUE(undoUnfinishedChange());
        EXPECT_EQ(messageOf(startEnabledServices()), "");
    }

    /// Has a child of this process make the change, in which these effects fail, and end before that one.
    void dieAt(int effect, const std::set<int>& failing, const Wanted& wanted) {
        const pid_t child = ::fork();
        if (child == 0) {
            killAt(effect, failing);
            (void)attempt(wanted);
            ::_exit(0);
        }
        int status = 0;
        EXPECT_EQ(::waitpid(child, &status, 0), child);
        EXPECT_TRUE(WIFSIGNALED(status)) << "there was no such effect";
        failThe({});
        recover();
    }

    /// Everything with the one state, and with the other, as a start of this system leaves it.
    struct Both {
        Everything before;
        Everything after;
    };

    Both both(const Wanted& from, const Wanted& to, std::vector<std::string>& effects) {
        reach(from); // once there and back, since there are files that no change removes
        reach(to);
        effects = seen();
        recover();
        Both states;
        states.after = everything();
        reach(from);
        recover();
        states.before = everything();
        return states;
    }

    bool isAs(const Everything& expected) const { return everything() == expected; }

    void expectOneOf(const Both& states) {
        if (!isAs(states.after)) {
            expectSame(everything(), states.before);
        }
        EXPECT_EQ(changeFindings(), Findings());
        EXPECT_TRUE(!client_ || client_->isServed());
    }

    /// Dies at each effect of the change once.
    void dieAtEach(const Wanted& from, const Wanted& to) {
        std::vector<std::string> effects;
        const Both states = both(from, to, effects);
        int completed = 0;
        for (int n = 1; n <= static_cast<int>(effects.size()); ++n) {
            const testing::ScopedTrace trace(__FILE__, __LINE__, effects.at(static_cast<std::size_t>(n) - 1));
            dieAt(n, {}, to);
            expectOneOf(states);
            if (isAs(states.after)) {
                ++completed;
                reach(from);
            }
        }
        EXPECT_GE(effects.size(), 10U);
        EXPECT_LT(completed, 4) << "what is left to do after the last store is to tell of it";
    }

    /// The same for each effect of undoing a change of which the last step failed.
    void dieAtEachUndoing(const Wanted& from, const Wanted& to) {
        std::vector<std::string> effects;
        const Both states = both(from, to, effects);
        const auto note = std::ranges::find(effects.rbegin(), effects.rend(), "store note of the change");
        ASSERT_NE(note, effects.rend());
        const int last = static_cast<int>(effects.rend() - note);
        failThe({last});
        ASSERT_FALSE(attempt(to).done);
        const int end = static_cast<int>(seen().size());
        ASSERT_GT(end, last + 5) << "each file, each daemon, the note";
        for (int n = last + 1; n <= end; ++n) {
            const testing::ScopedTrace trace(__FILE__, __LINE__, std::to_string(n - last));
            dieAt(n, {last}, to);
            expectSame(everything(), states.before);
            EXPECT_EQ(changeFindings(), Findings());
        }
    }

    std::optional<Client> client_; ///< which no change may cut
};

TEST_F(KilledChanges, RulesAndSettings) {
    dieAtEach(little(), much());
}

TEST_F(KilledChanges, TheUndoingOfThem) {
    dieAtEach(much(), little());
}

TEST_F(KilledChanges, ServicesThatExchangeTheirPorts) {
    Wanted exchanged = much();
    std::swap(exchanged.ftpPort, exchanged.sftpPort);
    dieAtEach(much(), exchanged);
}

TEST_F(KilledChanges, AServiceThatIsSwitchedOff) {
    Wanted off = much();
    off.ftpOn = false;
    dieAtEach(much(), off);
}

TEST_F(KilledChanges, AServiceThatIsSwitchedOffAndKeepsItsSessions) {
    policy_ = SessionPolicy::keep;
    reach(much());
    client_.emplace(much().ftpPort);
    ASSERT_TRUE(client_->isServed());
    Wanted off = much();
    off.ftpOn = false;
    dieAtEach(much(), off);
}

TEST_F(KilledChanges, WhileTheyAreUndone) {
    dieAtEachUndoing(little(), much());
}

TEST_F(KilledChanges, WhileAnExchangeOfPortsIsUndone) {
    Wanted exchanged = much();
    std::swap(exchanged.ftpPort, exchanged.sftpPort);
    dieAtEachUndoing(much(), exchanged);
}

} // namespace
} // namespace velt::test
