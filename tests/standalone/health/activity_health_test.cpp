// What is found about the record of what sessions did.
#include "standalone/activity/activity_reader.h"
#include "standalone/activity/operation_store.h"
#include "standalone/activity/spool.h"
#include "standalone/core/paths.h"
#include "tests/standalone/health/health_test.h"
#include "tests/standalone/support/state_folder.h"
#include "tests/support/result.h"
#include "tests/support/run_program.h"
#include "tests/support/waiting.h"

#include <gtest/gtest.h>

#include <chrono>

namespace velt::test {
namespace {

class ActivityHealth : public testing::Test {
protected:
    void TearDown() override { stopActivityReader(); }

    StateFolder folder_;
    const TimePoint now_ = std::chrono::floor<std::chrono::seconds>(std::chrono::system_clock::now());
};

TEST_F(ActivityHealth, LostRecordsAreCountedForADay) {
    EXPECT_EQ(activityFindings(now_), Findings());
    velt_lost_records* const lost = velt_open_lost(folder_.path().c_str());
    ASSERT_NE(lost, nullptr);
    EXPECT_EQ(activityFindings(now_), Findings());
    const auto time = std::chrono::floor<std::chrono::microseconds>(now_.time_since_epoch()).count();
    velt_count_lost(lost, time);
    const std::string folder = (folder_.path() / "var/lib/velt").string();
    EXPECT_EQ(
        activityFindings(now_),
        (Findings{{"records-lost", Severity::warning, "sessions",
                   "1 record of what sessions did could not be written, the last one within this day. "
                   "Nobody can look up what they said.",
                   "See that there is room on the disk of " + folder + "/transfers, run: df -h " + folder}}));
    velt_count_lost(lost, time);
    EXPECT_TRUE(activityFindings(now_)[0].sentence.starts_with("2 records of "));
    EXPECT_EQ(activityFindings(now_ + std::chrono::hours(24)), Findings());
}

TEST_F(ActivityHealth, WhoLosesRecordsBeforeTheirAgeIsNamedForADay) {
    auto store = OperationStore::open(statePath(paths::operationDatabase));
    ASSERT_EQ(messageOf(store), "");
    OperationRecord record;
    record.time = now_;
    record.session = "s";
    record.user = "anna";
    EXPECT_EQ(messageOf((*store)->take(1, 1, {record})), "");
    EXPECT_EQ(activityFindings(now_), Findings());
    EXPECT_EQ((*store)->trim({std::chrono::days(90), 1}, now_), true);
    EXPECT_EQ(
        activityFindings(now_),
        (Findings{{"records-early", Severity::warning, "sessions",
                   "Within this day, records of what sessions did were removed before their age, since they "
                   "take more room than max_size_mb in " +
                       (folder_.path() / "etc/velt/transfers.conf").string() + " allows: user anna.",
                   "Raise max_size_mb or lower max_age_days there. To see what fills the room, run: veltctl "
                   "transfers"}}));
    EXPECT_EQ(activityFindings(now_ + std::chrono::hours(25)), Findings());
}

TEST_F(ActivityHealth, ADamagedStoreIsNamedAndItsCommandMendsThat) {
    folder_.write("var/lib/velt/transfers.db", std::string(5000, 'x'));
    startActivityReader();
    ASSERT_TRUE(waitUntil([] { return !activityProblem().empty(); }, patience));
    const Findings found = activityFindings(now_);
    ASSERT_EQ(summary(found), "warning records-stuck");
    EXPECT_TRUE(found[0].sentence.starts_with("The record of operations ")) << found[0].sentence;
    const std::string& mend = found[0].mend;
    ASSERT_EQ(runProcess({"sh", "-c", mend.substr(mend.find("run: ") + 5)}).exitCode, 0) << mend;
    EXPECT_TRUE(waitUntil([] { return activityProblem().empty(); }, patience));
    EXPECT_EQ(activityFindings(now_), Findings());
}

} // namespace
} // namespace velt::test
