// Whether the shares and rules are those that a session knows.
#include "standalone/core/paths.h"
#include "tests/support/temporary_folder.h"

#include <gtest/gtest.h>

#include <sched.h>
#include <sys/mount.h>
#include <sys/stat.h>

extern "C" {
#include "standalone/login/access_files.h"
}

#include <cerrno>
#include <chrono>
#include <climits>
#include <cstring>
#include <filesystem>
#include <string>

namespace velt::test {
namespace {
namespace fs = std::filesystem;

/// The parameter is the path of one of the files below the state root.
class AccessFiles : public testing::TestWithParam<std::string> {
protected:
    void SetUp() override {
        root_.write(paths::shares.substr(1), "shares");
        root_.write(paths::chrootRules.substr(1), "rules");
        note();
    }
    void note() const { ASSERT_EQ(velt_note_access_files(root_.path().c_str()), 0); }
    std::string path() const { return root_.path().string() + GetParam(); }
    static bool changed() { return velt_access_files_changed() != 0; }

    TemporaryFolder root_;
};

TEST_P(AccessFiles, areTheSameUntilTheyAreWritten) {
    EXPECT_FALSE(changed());
    root_.write("etc/velt/ftp.conf", "other");
    EXPECT_FALSE(changed());
    root_.write(GetParam().substr(1), "another text");
    EXPECT_TRUE(changed());
    note();
    EXPECT_FALSE(changed());
}

TEST_P(AccessFiles, areOthersWhenTheirTimesAre) {
    fs::last_write_time(path(), fs::last_write_time(path()) - std::chrono::nanoseconds(1));
    EXPECT_TRUE(changed());
}

TEST_P(AccessFiles, areOthersWhenTheyAreReplaced) {
    const auto time = fs::last_write_time(path());
    const std::string text = root_.read(GetParam().substr(1));
    const auto other = root_.write("other", text);
    fs::last_write_time(other, time);
    fs::rename(other, path());
    EXPECT_TRUE(changed()) << "size and time of writing are the same";
}

TEST_P(AccessFiles, areOthersWhileAnotherFileIsMountedOverThem) {
    if (unshare(CLONE_NEWNS) != 0 || mount(nullptr, "/", nullptr, MS_REC | MS_PRIVATE, nullptr) != 0) {
        GTEST_SKIP() << "no mount namespace: " << std::strerror(errno);
    }
    note();
    const auto other = root_.write("other", root_.read(GetParam().substr(1)));
    ASSERT_EQ(mount(other.c_str(), path().c_str(), nullptr, MS_BIND, nullptr), 0);
    EXPECT_TRUE(changed());
    ASSERT_EQ(umount2(path().c_str(), MNT_DETACH), 0);
    EXPECT_FALSE(changed());
}

TEST_P(AccessFiles, areOthersWhenAFolderOnTheirWayIsExchanged) {
    const TemporaryFolder aside;
    for (const char* name : {"etc/velt", "etc"}) {
        const fs::path folder = root_.path() / name;
        fs::rename(folder, aside.path() / "former");
        EXPECT_TRUE(changed()) << name << " is gone";
        fs::copy(aside.path() / "former", folder, fs::copy_options::recursive);
        EXPECT_TRUE(changed()) << name << " is a copy";
        fs::remove_all(folder);
        fs::rename(aside.path() / "former", folder);
        EXPECT_FALSE(changed()) << name << " is back";
    }
}

TEST_P(AccessFiles, areOthersWhenALinkToThemLeadsElsewhere) {
    const TemporaryFolder other;
    fs::rename(root_.path() / "etc/velt", root_.path() / "kept");
    fs::create_directory_symlink("../kept", root_.path() / "etc/velt");
    note();
    EXPECT_FALSE(changed());
    fs::copy(root_.path() / "kept", other.path(), fs::copy_options::recursive);
    fs::remove(root_.path() / "etc/velt");
    fs::create_directory_symlink(other.path(), root_.path() / "etc/velt");
    EXPECT_TRUE(changed());
}

TEST_P(AccessFiles, comeAndGo) {
    fs::remove(path());
    EXPECT_TRUE(changed());
    note();
    EXPECT_FALSE(changed());
    fs::create_symlink("elsewhere", path());
    EXPECT_TRUE(changed());
}

TEST_P(AccessFiles, areOthersWhenTheyCannotBeLookedAt) {
    fs::remove_all(root_.path() / "etc/velt");
    EXPECT_TRUE(changed());
    EXPECT_EQ(velt_note_access_files(root_.path().c_str()), -1);
    EXPECT_EQ(errno, ENOENT);
    EXPECT_TRUE(changed());
    EXPECT_EQ(velt_note_access_files(std::string(PATH_MAX, 'x').c_str()), -1);
    EXPECT_EQ(errno, ENAMETOOLONG);
}

INSTANTIATE_TEST_SUITE_P(Each, AccessFiles,
                         testing::Values(std::string(paths::shares), std::string(paths::chrootRules)));

} // namespace
} // namespace velt::test
