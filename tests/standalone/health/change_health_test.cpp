// What is found about changes that were left half-way.
#include "base/file.h"
#include "standalone/core/paths.h"
#include "standalone/core/unfinished_change.h"
#include "tests/standalone/health/health_test.h"
#include "tests/standalone/support/state_folder.h"

#include <gtest/gtest.h>

namespace velt::test {
namespace {

class ChangeHealth : public testing::Test {
protected:
    StateFolder folder_;
};

TEST_F(ChangeHealth, ANoteThatNobodyWorksOnIsNamed) {
    EXPECT_EQ(changeFindings(), Findings());
    {
        const ChangeAtWork work;
        ASSERT_TRUE(noteChange({}));
        EXPECT_EQ(changeFindings(), Findings()) << "it may still be done";
    }
    EXPECT_EQ(changeFindings(),
              (Findings{{"change-half-undone", Severity::error, "settings",
                         "A change failed and could be taken back only in part: settings and "
                         "services may be those of before in one place, and the new ones in "
                         "another.",
                         "Restart veltd."}}));
    ASSERT_TRUE(forgetChange());
    EXPECT_EQ(changeFindings(), Findings());
}

TEST_F(ChangeHealth, ANoteThatCannotBeReadIsNamed) {
    const auto note = placeBelowRoot(paths::unfinishedChange);
    ASSERT_TRUE(replaceFile(note, "nonsense", 0600));
    EXPECT_EQ(changeFindings(),
              (Findings{{"change-note-damaged", Severity::error, "settings",
                         "The note of a change that was left half-way, " + note.string() + ", is damaged.",
                         "Check the settings, then run: rm " + note.string()}}));
}

} // namespace
} // namespace velt::test
