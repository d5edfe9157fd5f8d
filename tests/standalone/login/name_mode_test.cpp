// Modes are set of names, not of what links lead to.
#include "base/unique_fd.h"
#include "tests/support/temporary_folder.h"

#include <gtest/gtest.h>

#include <fcntl.h>
#include <sys/stat.h>

extern "C" {
#include "standalone/login/name_mode.h"
}

#include <cerrno>
#include <filesystem>
#include <fstream>

namespace velt::test {
namespace {

using SetMode = int (*)(int, const char*, mode_t);

class NameMode : public testing::TestWithParam<SetMode> {
protected:
    void SetUp() override {
        std::ofstream(folder_.path() / "file").flush();
        std::filesystem::create_directory(folder_.path() / "folder");
        std::filesystem::create_symlink("file", folder_.path() / "link");
        ASSERT_EQ(mkfifo((folder_.path() / "fifo").c_str(), 0600), 0);
        place_ = UniqueFd(::open(folder_.path().c_str(), O_PATH | O_DIRECTORY | O_CLOEXEC));
    }

    int set(const char* name, mode_t mode) const { return GetParam()(place_.get(), name, mode); }
    mode_t modeOf(const char* name) const {
        struct stat status {};
        EXPECT_EQ(fstatat(place_.get(), name, &status, AT_SYMLINK_NOFOLLOW), 0);
        return status.st_mode & 07777U;
    }

private:
    TemporaryFolder folder_;
    UniqueFd place_;
};

TEST_P(NameMode, isSetOfWhatStandsThere) {
    for (const char* const name : {"file", "folder", "fifo"}) {
        EXPECT_EQ(set(name, 0501), 0) << name;
        EXPECT_EQ(modeOf(name), 0501U) << name;
    }
}

TEST_P(NameMode, isNotSetThroughALink) {
    ASSERT_EQ(set("file", 0600), 0);
    EXPECT_EQ(set("link", 0666), -1);
    EXPECT_TRUE(errno == EOPNOTSUPP || errno == ELOOP) << errno;
    EXPECT_EQ(modeOf("file"), 0600U);
}

TEST_P(NameMode, failsWhereThereIsNothing) {
    EXPECT_EQ(set("none", 0600), -1);
    EXPECT_EQ(errno, ENOENT);
}

INSTANTIATE_TEST_SUITE_P(ByEitherWay, NameMode, testing::Values(velt_set_mode_at, velt_set_mode_by_opening));

} // namespace
} // namespace velt::test
