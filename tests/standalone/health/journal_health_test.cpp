// What is found about the administrator log and the history in it.
#include "standalone/core/paths.h"
#include "standalone/journal/change_history.h"
#include "standalone/journal/sqlite_file.h"
#include "tests/standalone/health/health_test.h"
#include "tests/standalone/support/state_folder.h"
#include "tests/support/run_program.h"

#include <gtest/gtest.h>

#include <chrono>

namespace velt::test {
namespace {

using std::chrono::seconds;

class JournalHealth : public testing::Test {
protected:
    StateFolder folder_;
    const TimePoint now_ = std::chrono::floor<seconds>(std::chrono::system_clock::now());
};

TEST_F(JournalHealth, AChangeThatIsOverdueIsNamed) {
    ChangeRecord change;
    change.state = ChangeState::waiting;
    change.confirmBy = now_;
    ASSERT_TRUE(recordChange(change));
    EXPECT_EQ(journalFindings(now_ + seconds(5)), Findings()) << "it may be at work";
    EXPECT_EQ(
        journalFindings(now_ + seconds(6)),
        (Findings{{"change-unconfirmed", Severity::error, "settings",
                   "The change 1 was not confirmed in time, but could not be taken back: it is still in "
                   "force. veltd's log has the reason, and it is tried again every half minute.",
                   "veltctl undo 1"}}));
    ASSERT_TRUE(setChangeState(1, ChangeState::superseded));
    EXPECT_EQ(journalFindings(now_ + seconds(6)), Findings());
}

TEST_F(JournalHealth, ADamagedLogIsNamedAndItsCommandMendsThat) {
    const std::string log = statePath(paths::logDatabase).string();
    folder_.write("var/lib/velt/log.db", std::string(5000, 'x'));
    const Findings found = journalFindings(now_);
    ASSERT_EQ(summary(found), "warning log-unusable");
    EXPECT_TRUE(found[0].sentence.starts_with("The administrator log " + log + " cannot be "))
        << found[0].sentence;
    const std::string& mend = found[0].mend;
    ASSERT_EQ(runProcess({"sh", "-c", mend.substr(mend.find("run: ") + 5)}).exitCode, 0) << mend;
    EXPECT_EQ(journalFindings(now_), Findings());
    EXPECT_TRUE(std::filesystem::exists(folder_.path() / "var/lib/velt/damaged-log/log.db"));
}

TEST_F(JournalHealth, ALogThatSomebodyWritesIsGood) {
    ASSERT_EQ(journalFindings(now_), Findings());
    const DatabaseOwner other = std::move(*openDatabase(statePath(paths::logDatabase)));
    ASSERT_EQ(execute(other.get(), "BEGIN IMMEDIATE"), SQLITE_OK);
    EXPECT_EQ(journalFindings(now_), Findings());
}

} // namespace
} // namespace velt::test
