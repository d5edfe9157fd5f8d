// Files that are changed aside.
#include "standalone/core/staged_files.h"

#include "base/file.h"
#include "standalone/core/paths.h"
#include "standalone/settings/settings.h"
#include "tests/standalone/support/state_folder.h"
#include "tests/support/result.h"

#include <gtest/gtest.h>

#include <sys/stat.h>

#include <thread>

namespace velt::test {
namespace {

class StagedFilesTest : public testing::Test {
protected:
    StateFolder folder_;
};

constexpr std::string_view name = paths::sftpSettings;

std::string stored() {
    return readFile(placeBelowRoot(name)).valueOr("none");
}

Result<> write(const std::string& text) {
    VELT_ASSIGN_OR_RETURN(const auto place, storePath(name));
    return replaceFile(place, text, 0600);
}

TEST_F(StagedFilesTest, OnlyTheirThreadSeesThem) {
    ASSERT_TRUE(write("former"));
    auto staged = StagedFiles::begin();
    ASSERT_TRUE(staged);
    EXPECT_EQ(statePath(name), placeBelowRoot(name)) << "a file that nobody wrote is not copied";
    ASSERT_TRUE(write("staged"));
    EXPECT_EQ(readFile(statePath(name)), "staged");
    EXPECT_EQ(stored(), "former");
    std::thread([] { EXPECT_EQ(readFile(statePath(name)), "former"); }).join();
}

TEST_F(StagedFilesTest, AreGoneWithTheirOwner) {
    std::filesystem::path copy;
    {
        auto staged = StagedFiles::begin();
        ASSERT_TRUE(staged);
        ASSERT_TRUE(write("staged"));
        copy = statePath(name);
        ASSERT_TRUE(fileExists(copy));
    }
    EXPECT_FALSE(fileExists(copy));
    EXPECT_EQ(statePath(name), placeBelowRoot(name));
    EXPECT_EQ(stored(), "none");
}

TEST_F(StagedFilesTest, TellWhatDiffers) {
    ASSERT_TRUE(write("former"));
    auto staged = StagedFiles::begin();
    ASSERT_TRUE(staged);
    ASSERT_TRUE(write("new"));
    const auto file = storePath(paths::chrootRules);
    ASSERT_TRUE(file);
    ASSERT_TRUE(replaceFile(*file, "rules", 0640));
    const std::vector<StagedFile> expected{{std::string(name), "former", "new", 0600},
                                           {std::string(paths::chrootRules), std::nullopt, "rules", 0640}};
    EXPECT_EQ(staged->changes(), expected);
    ASSERT_TRUE(write("former"));
    ASSERT_TRUE(staged->changes());
    EXPECT_EQ(staged->changes()->size(), 1U) << "changed and changed back is no change";
}

TEST_F(StagedFilesTest, KeepWhatAWriterDoesNotTouch) {
    ASSERT_TRUE(write("one\n"));
    auto staged = StagedFiles::begin();
    const auto place = storePath(name);
    ASSERT_TRUE(place);
    EXPECT_EQ(readFile(*place), "one\n");
    struct stat status {};
    ASSERT_EQ(::stat(place->c_str(), &status), 0);
    EXPECT_EQ(status.st_mode & 0777, 0600U);
}

TEST_F(StagedFilesTest, AreStoredAndBroughtBack) {
    const StagedFile file{std::string(name), std::nullopt, "new", 0600};
    ASSERT_TRUE(store(file));
    EXPECT_EQ(stored(), "new");
    ASSERT_TRUE(restore(file));
    EXPECT_EQ(stored(), "none");
    EXPECT_TRUE(restore(file)) << "there is nothing to remove, which is as it was";
    ASSERT_TRUE(restore({std::string(name), "former", "new", 0600}));
    EXPECT_EQ(stored(), "former");
}

} // namespace
} // namespace velt::test
