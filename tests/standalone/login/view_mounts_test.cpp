// Real mounts, in a mount namespace of the test's own.
#include "standalone/login/view_mounts.h"

#include "base/ask_child.h"
#include "standalone/login/open_folder.h"
#include "tests/support/result.h"
#include "tests/support/temporary_folder.h"

#include <gtest/gtest.h>

#include <fcntl.h>
#include <linux/filter.h>
#include <linux/seccomp.h>
#include <sched.h>
#include <sys/mount.h>
#include <sys/prctl.h>
#include <sys/statvfs.h>
#include <sys/syscall.h>

#include <array>
#include <cerrno>
#include <cstddef>
#include <cstring>

namespace velt::test {
namespace {
namespace fs = std::filesystem;

class ViewMounts : public testing::Test {
protected:
    void SetUp() override {
        if (unshare(CLONE_NEWNS) != 0) {
            GTEST_SKIP() << "no mount namespace: " << std::strerror(errno);
        }
        ASSERT_EQ(messageOf(isolateMounts()), "");
        fs::create_directories(view_);
        fs::create_directories(root_.path() / "server");
        mountDisk(root_.path() / "server");
        fs::create_directories(share_ / "inner/deep");
        fs::create_directories(share_ / "disk");
        mountDisk(share_ / "disk");
        root_.write("server/share/inner/file", "x");
    }
    void TearDown() override {
        while (umount2(view_.c_str(), MNT_DETACH) == 0) { // each folder that was shown covers the former one
        }
        umount2((root_.path() / "server").c_str(), MNT_DETACH);
    }

    static void mountDisk(const fs::path& place) {
        ASSERT_EQ(mount("disk", place.c_str(), "tmpfs", 0, nullptr), 0) << std::strerror(errno);
    }
    VisibleFolder share(Access access, std::vector<Restriction> restrictions = {}) const {
        auto folder = openFolder(share_);
        EXPECT_EQ(messageOf(folder), "");
        return {std::move(*folder), access, std::move(restrictions)};
    }
    /// Why no file can be made in the folder; "" when one can.
    static std::string whyNotWritable(const fs::path& folder) {
        const UniqueFd file(open((folder / "new").c_str(), O_WRONLY | O_CREAT | O_CLOEXEC, 0600));
        return file ? "" : std::strerror(errno);
    }

    TemporaryFolder root_;
    const fs::path share_ = root_.path() / "server/share";
    const fs::path view_ = root_.path() / "view";
    const std::string readOnly_ = std::strerror(EROFS);
};

TEST_F(ViewMounts, forReadingAreReadOnlyWithAllThatIsMountedBelow) {
    ASSERT_EQ(messageOf(showFolder(view_, share(Access::read))), "");
    EXPECT_TRUE(fs::exists(view_ / "inner/file"));
    EXPECT_EQ(whyNotWritable(view_), readOnly_);
    EXPECT_EQ(whyNotWritable(view_ / "disk"), readOnly_);
    EXPECT_EQ(whyNotWritable(share_ / "disk"), "") << "the server's own mount does not change";
}

TEST_F(ViewMounts, forWritingAreWritable) {
    ASSERT_EQ(messageOf(showFolder(view_, share(Access::write))), "");
    EXPECT_EQ(whyNotWritable(view_), "");
    EXPECT_EQ(whyNotWritable(view_ / "disk"), "");
    EXPECT_TRUE(fs::exists(share_ / "new"));
}

TEST_F(ViewMounts, giveNoFileRightsOfItsOwn) {
    constexpr unsigned long wanted = ST_NOSUID | ST_NODEV | ST_NOEXEC;
    const auto flags = [](const fs::path& place) {
        struct statvfs facts {};
        return statvfs(place.c_str(), &facts) == 0 ? facts.f_flag & wanted : 0;
    };
    ASSERT_EQ(messageOf(showFolder(view_, share(Access::write, {{"inner", Access::read}}))), "");
    for (const char* place : {"", "disk", "inner"}) {
        EXPECT_EQ(flags(view_ / place), wanted) << place;
    }
    SideBySide view(view_);
    ASSERT_EQ(messageOf(view.begin()), "");
    ASSERT_EQ(messageOf(view.add("share", share(Access::write))), "");
    ASSERT_EQ(messageOf(view.finish()), "");
    for (const char* place : {"", "share", "share/disk"}) {
        EXPECT_EQ(flags(view_ / place), wanted) << place;
    }
    EXPECT_EQ(flags(share_), 0U) << "the server's own mount does not change";
}

TEST_F(ViewMounts, doNotFollowWhatIsMountedLater) {
    ASSERT_EQ(mount(nullptr, (root_.path() / "server").c_str(), nullptr, MS_REC | MS_SHARED, nullptr), 0);
    ASSERT_EQ(messageOf(showFolder(view_, share(Access::write))), "");
    mountDisk(share_ / "inner");
    root_.write("server/share/inner/later", "x");
    EXPECT_FALSE(fs::exists(view_ / "inner/later"));
    EXPECT_TRUE(fs::exists(view_ / "inner/file"));
}

TEST_F(ViewMounts, restrictFoldersWithin) {
    ASSERT_EQ(messageOf(showFolder(view_, share(Access::write, {{"inner/deep", Access::read}}))), "");
    EXPECT_EQ(whyNotWritable(view_ / "inner"), "");
    EXPECT_EQ(whyNotWritable(view_ / "inner/deep"), readOnly_);
}

TEST_F(ViewMounts, hideFoldersWithAllThatIsInThem) {
    const std::vector<Restriction> both = {{"inner", Access::none}, {"inner/deep", Access::read}};
    ASSERT_EQ(messageOf(showFolder(view_, share(Access::write, both))), "");
    EXPECT_TRUE(fs::is_empty(view_ / "inner"));
    EXPECT_EQ(whyNotWritable(view_ / "inner"), readOnly_);
    EXPECT_TRUE(fs::exists(share_ / "inner/file"));
}

TEST_F(ViewMounts, areRefusedWhereARestrictionCannotBeMade) {
    EXPECT_FALSE(showFolder(view_, share(Access::write, {{"absent", Access::read}})));
    fs::create_directory_symlink("inner", share_ / "link");
    EXPECT_FALSE(showFolder(view_, share(Access::write, {{"link", Access::none}})));
}

TEST_F(ViewMounts, sideBySideLeaveOutWhatCannotBeRestricted) {
    SideBySide view(view_);
    ASSERT_EQ(messageOf(view.begin()), "");
    EXPECT_EQ(messageOf(view.add("good", share(Access::write))), "");
    EXPECT_FALSE(view.add("bad", share(Access::write, {{"absent", Access::read}})));
    ASSERT_EQ(messageOf(view.finish()), "");
    EXPECT_TRUE(fs::exists(view_ / "good/inner/file"));
    EXPECT_EQ(whyNotWritable(view_ / "good"), "");
    EXPECT_FALSE(fs::exists(view_ / "bad"));
    EXPECT_EQ(whyNotWritable(view_), readOnly_);
}

/// From now on this process can unmount nothing.
bool forbidUnmounting() {
    std::array<sock_filter, 4> program{{
        BPF_STMT(BPF_LD | BPF_W | BPF_ABS, offsetof(seccomp_data, nr)),
        BPF_JUMP(BPF_JMP | BPF_JEQ | BPF_K, SYS_umount2, 0, 1),
        BPF_STMT(BPF_RET | BPF_K, SECCOMP_RET_ERRNO | EPERM),
        BPF_STMT(BPF_RET | BPF_K, SECCOMP_RET_ALLOW),
    }};
    const sock_fprog filter{program.size(), program.data()};
    return prctl(PR_SET_NO_NEW_PRIVS, 1, 0, 0, 0) == 0 &&
           prctl(PR_SET_SECCOMP, SECCOMP_MODE_FILTER, &filter) == 0;
}

TEST_F(ViewMounts, sideBySideAreRefusedWhereWhatIsNotRestrictedStays) {
    const auto outcome = askChild([this] {
        SideBySide view(view_);
        const bool good = forbidUnmounting() && view.begin() && view.add("good", share(Access::write)) &&
                          !view.add("bad", share(Access::write, {{"absent", Access::read}}));
        return !good ? 1 : view.finish() ? 2 : 0;
    });
    ASSERT_EQ(messageOf(outcome), "");
    EXPECT_EQ(*outcome, 0) << "2: what may show too much can be used";
    EXPECT_TRUE(fs::exists(view_ / "bad")) << "the test needs it to stay";
}

} // namespace
} // namespace velt::test
