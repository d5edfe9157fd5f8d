// The note of a change that may be cut off.
#include "standalone/core/unfinished_change.h"

#include "base/file.h"
#include "standalone/change/settings_change.h"
#include "standalone/core/paths.h"
#include "tests/standalone/support/state_folder.h"
#include "tests/support/result.h"

#include <gtest/gtest.h>

namespace velt::test {
namespace {

class UnfinishedChangeTest : public testing::Test {
protected:
    StateFolder folder_;
};

const std::vector<StagedFile>& files() {
    static const std::vector<StagedFile> all{{"/etc/velt/ftp.conf", "a = 1\n0 3 /x\n", "", 0644},
                                             {"/etc/velt/run-keys/ftpd", std::nullopt, "", 0644},
                                             {"/etc/velt/chroot_rules", "", "", 0600}};
    return all;
}

TEST_F(UnfinishedChangeTest, IsReadAsItWasNoted) {
    ASSERT_TRUE(noteChange(files()));
    EXPECT_EQ(unfinishedChange(), files());
    ASSERT_TRUE(forgetChange());
    EXPECT_EQ(unfinishedChange(), std::vector<StagedFile>());
    EXPECT_TRUE(forgetChange()) << "there is nothing to forget";
}

TEST_F(UnfinishedChangeTest, RestoresEachFile) {
    ASSERT_TRUE(noteChange(files()));
    for (const StagedFile& file : files()) {
        ASSERT_TRUE(replaceFile(placeBelowRoot(file.name), "new", 0644));
    }
    EXPECT_EQ(undoUnfinishedChange(), true);
    for (const StagedFile& file : files()) {
        EXPECT_EQ(readOptionalFile(placeBelowRoot(file.name)), file.before);
    }
    EXPECT_EQ(undoUnfinishedChange(), false);
}

TEST_F(UnfinishedChangeTest, ADamagedNoteChangesNothing) {
    ASSERT_TRUE(noteChange(files()));
    const auto note = readFile(placeBelowRoot(paths::unfinishedChange));
    ASSERT_TRUE(note);
    for (std::size_t size = 0; size < note->size(); ++size) {
        ASSERT_TRUE(replaceFile(placeBelowRoot(paths::unfinishedChange), note->substr(0, size), 0600));
        const auto undone = undoUnfinishedChange();
        ASSERT_FALSE(undone) << size << " of " << note->size() << " bytes";
        EXPECT_NE(undone.error().message.find("unfinished-change: it is damaged."), std::string::npos);
    }
}

} // namespace
} // namespace velt::test
