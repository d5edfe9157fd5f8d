// The history of the settings.
#include "standalone/journal/change_history.h"

#include "base/file.h"
#include "standalone/core/paths.h"
#include "standalone/journal/admin_log.h"
#include "tests/standalone/support/state_folder.h"
#include "tests/support/result.h"

#include <gtest/gtest.h>

#include <sys/stat.h>

namespace velt::test {
namespace {

using std::chrono::hours;
using std::chrono::milliseconds;
using std::chrono::system_clock;

class ChangeHistoryTest : public testing::Test {
protected:
    static ChangeRecord change(const std::string& fields, system_clock::time_point time = now()) {
        ChangeRecord record;
        record.time = time;
        record.actor = "anna";
        record.address = "192.0.2.1";
        record.way = "settings";
        record.fields = fields;
        return record;
    }
    static system_clock::time_point now() { return std::chrono::floor<milliseconds>(system_clock::now()); }

    static std::int64_t record(const ChangeRecord& record) {
        const auto id = recordChange(record);
        EXPECT_TRUE(id) << messageOf(id);
        return id.valueOr(0);
    }
    static std::vector<std::string> kept(const ChangeFilter& filter = {}) {
        const auto found = queryChanges(filter);
        EXPECT_TRUE(found) << messageOf(found);
        std::vector<std::string> fields;
        for (const ChangeRecord& each : found.valueOr({})) {
            fields.push_back(each.fields.substr(0, 10));
        }
        return fields;
    }

    StateFolder folder_;
};

using Fields = std::vector<std::string>;

TEST_F(ChangeHistoryTest, AChangeIsReadAsItWasWritten) {
    ChangeRecord written = change(R"([{"field": "/a"}])");
    written.state = ChangeState::waiting;
    written.confirmBy = written.time + hours(1);
    const auto id = record(written);
    const auto found = changeRecord(id);
    ASSERT_TRUE(found && *found);
    EXPECT_EQ((*found)->id, id);
    EXPECT_EQ((*found)->time, written.time);
    EXPECT_EQ((*found)->actor, "anna");
    EXPECT_EQ((*found)->address, "192.0.2.1");
    EXPECT_EQ((*found)->way, "settings");
    EXPECT_EQ((*found)->fields, written.fields);
    EXPECT_EQ((*found)->state, ChangeState::waiting);
    EXPECT_EQ((*found)->confirmBy, written.confirmBy);
    EXPECT_FALSE(*changeRecord(id + 1));
}

TEST_F(ChangeHistoryTest, IsPagedAndNarrowed) {
    for (const char* fields : {"one", "two", "three"}) {
        record(change(fields));
    }
    EXPECT_EQ(kept(), (Fields{"three", "two", "one"}));
    ASSERT_TRUE(setChangeState(2, ChangeState::undone));
    ChangeFilter filter;
    filter.state = ChangeState::done;
    EXPECT_EQ(kept(filter), (Fields{"three", "one"}));
    filter.beforeId = 3;
    EXPECT_EQ(kept(filter), Fields{"one"});
    EXPECT_EQ(kept({std::nullopt, std::nullopt, 1}), Fields{"three"});
    EXPECT_FALSE(queryChanges({std::nullopt, std::nullopt, 0}));
    EXPECT_FALSE(queryChanges({std::nullopt, std::nullopt, 1001}));
    EXPECT_TRUE(setChangeState(99, ChangeState::undone)) << "one that is not kept any more";
}

TEST_F(ChangeHistoryTest, OldChangesGoWithTheLog) {
    ASSERT_TRUE(replaceFile(statePath(paths::logRetention), "max_age_days = 2\n", 0644));
    record(change("old", now() - hours(72)));
    record(change("new"));
    EXPECT_EQ(kept(), Fields{"new"});
    ASSERT_TRUE(replaceFile(statePath(paths::logRetention), "max_age_days = 0\n", 0644));
    record(change("older", now() - hours(9000)));
    EXPECT_EQ(kept().size(), 2U) << "no limit";
}

TEST_F(ChangeHistoryTest, LargeChangesPushOutOlderOnes) {
    const std::string large(static_cast<std::size_t>(keptBytes) / 3, 'x');
    for (const char* name : {"a", "b", "c", "d"}) {
        record(change(name + large));
    }
    EXPECT_EQ(kept(), (Fields{"dxxxxxxxxx", "cxxxxxxxxx"}));
    record(change("e" + std::string(static_cast<std::size_t>(keptBytes) + 1, 'x')));
    EXPECT_EQ(kept(), Fields{"exxxxxxxxx"}) << "the newest stays";
}

TEST_F(ChangeHistoryTest, SharesItsFileWithTheLog) {
    record(change("first"));
    ASSERT_TRUE(logEvent(2, 1, 0x11B00002, {"", "", "", ""}));
    record(change("second"));
    EXPECT_EQ(kept().size(), 2U);
    ASSERT_TRUE(queryLog({}));
    EXPECT_EQ(queryLog({})->size(), 1U);
    struct stat status {};
    ASSERT_EQ(::stat(statePath(paths::logDatabase).c_str(), &status), 0);
    EXPECT_EQ(status.st_mode & 0777, 0600U);
}

} // namespace
} // namespace velt::test
