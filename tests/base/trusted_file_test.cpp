#include "base/trusted_file.h"

#include "tests/support/result.h"
#include "tests/support/temporary_folder.h"

#include <gtest/gtest.h>

#include <sys/stat.h>
#include <unistd.h>

namespace velt::test {
namespace {

class TrustedFile : public testing::Test {
protected:
    std::filesystem::path fileWithMode(mode_t mode) {
        auto file = folder_.write("file", "text");
        EXPECT_EQ(chmod(file.c_str(), mode), 0);
        return file;
    }

    TemporaryFolder folder_;
};

TEST_F(TrustedFile, isReadAsAWhole) {
    for (const mode_t mode : {0600U, 0644U, 0444U}) {
        EXPECT_EQ(readTrusted(fileWithMode(mode)), "text") << mode;
    }
    const std::string bytes("a\0\n\xff", 4);
    const auto file = folder_.write("bytes", bytes);
    chmod(file.c_str(), 0600);
    EXPECT_EQ(readTrusted(file), bytes);
}

TEST_F(TrustedFile, isNoneThatOthersMayWrite) {
    for (const mode_t mode : {0620U, 0602U, 0666U}) {
        const auto refused = messageOf(readTrusted(fileWithMode(mode)));
        EXPECT_NE(refused.find("other accounts may write to it"), std::string::npos)
            << mode << ": " << refused;
    }
}

TEST_F(TrustedFile, isNoneOfAnotherAccount) {
    if (geteuid() != 0) {
        GTEST_SKIP() << "only root can give a file away";
    }
    const auto file = fileWithMode(0600);
    ASSERT_EQ(chown(file.c_str(), 54321, 54321), 0);
    EXPECT_FALSE(readTrusted(file));
}

TEST_F(TrustedFile, isARegularFile) {
    const auto file = fileWithMode(0600);
    std::filesystem::create_symlink(file, folder_.path() / "link");
    EXPECT_FALSE(readTrusted(folder_.path() / "link"));
    ASSERT_EQ(mkfifo((folder_.path() / "pipe").c_str(), 0600), 0);
    EXPECT_FALSE(readTrusted(folder_.path() / "pipe")) << "and it does not wait for a writer";
    EXPECT_FALSE(readTrusted(folder_.path()));
    EXPECT_FALSE(readTrusted(folder_.path() / "absent"));
}

// This one says that it is empty, and is not: as one does that grows while it is read.
TEST_F(TrustedFile, isOfTheSizeThatItSays) {
    EXPECT_FALSE(readTrusted("/proc/self/stat"));
}

TEST_F(TrustedFile, isOfLimitedSize) {
    const auto file = fileWithMode(0600);
    ASSERT_EQ(truncate(file.c_str(), (off_t{16} << 20) + 1), 0);
    EXPECT_FALSE(readTrusted(file));
}

} // namespace
} // namespace velt::test
