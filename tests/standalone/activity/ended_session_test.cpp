// What is recorded of a session that ended without a word, from what its page says.
#include "standalone/activity/ended_session.h"

#include "base/file.h"
#include "standalone/activity/spool.h"
#include "standalone/activity/spool_text.h"
#include "standalone/core/state_root.h"
#include "tests/standalone/support/state_folder.h"
#include "tests/support/result.h"

#include <gtest/gtest.h>

#include <cstdint>
#include <cstring>

namespace velt {
namespace {

class EndedSessionTest : public testing::Test {
protected:
    EndedSessionTest() {
        page_.form = velt_page_form;
        page_.transfer = velt_upload;
        page_.transfer_record = 7;
        std::strcpy(page_.user, "anna");
    }

    /// What the spool has then.
    SpoolText recorded() {
        const auto name = parseSessionName("1z4-8rd2k-0f3a9c21");
        EXPECT_TRUE(name && recordEndedSession(*name, page_));
        const auto text = readFile(statePath(VELT_SPOOL_FOLDER) / VELT_SPOOL_NAME);
        EXPECT_EQ(test::messageOf(text), "");
        return parseSpool(text.valueOr(""));
    }

    test::StateFolder root_;
    velt_session_page page_{};
};

TEST_F(EndedSessionTest, HasItsTransferAndItsEnd) {
    page_.since = 1'000'000;
    page_.transfer_since = 2'000'000;
    page_.active = 5'000'000;
    page_.transfer_octets = 100;
    page_.octets_in = 11;
    const SpoolText text = recorded();
    ASSERT_EQ(text.records.size(), 2U);
    EXPECT_EQ(text.records[0].operation, Operation::upload);
    EXPECT_EQ(text.records[0].number, 7);
    EXPECT_EQ(text.records[0].duration, std::chrono::seconds(3));
    EXPECT_EQ(text.records[1].operation, Operation::sessionClosed);
    EXPECT_EQ(text.records[1].octetsIn, 111U);
    EXPECT_EQ(text.records[1].duration, std::chrono::seconds(4));
}

// Whoever has taken a session over writes its page.
TEST_F(EndedSessionTest, IsRecordedWhateverThePageSays) {
    for (const std::int64_t since : {INT64_MIN, std::int64_t{-1}, INT64_MAX}) {
        for (const std::int64_t active : {INT64_MIN, std::int64_t{-1}, INT64_MAX}) {
            page_.since = since;
            page_.transfer_since = since;
            page_.active = active;
            page_.transfer_octets = UINT64_MAX;
            page_.octets_in = UINT64_MAX;
            page_.protocol = UINT32_MAX;
            std::memset(page_.user, 'x', sizeof page_.user);
            std::memset(page_.transfer_path, '\xff', sizeof page_.transfer_path);
            std::filesystem::remove_all(statePath("/var"));
            const SpoolText text = recorded();
            EXPECT_EQ(text.records.size(), 2U) << since << " " << active;
            EXPECT_EQ(text.damaged, 0U);
        }
    }
}

} // namespace
} // namespace velt
