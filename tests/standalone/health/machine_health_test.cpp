// What is found about the machine.
#include "standalone/settings/settings_store.h"
#include "tests/standalone/health/health_test.h"
#include "tests/standalone/support/state_folder.h"
#include "tests/support/result.h"
#include "tests/support/run_program.h"

#include <gtest/gtest.h>

#include <sched.h>
#include <sys/mount.h>
#include <sys/stat.h>
#include <unistd.h>

#include <ctime>

namespace velt::test {
namespace {

using Clock = std::chrono::system_clock;
using std::chrono::hours;

class MachineHealth : public testing::Test {
protected:
    void SetUp() override { ASSERT_EQ(messageOf(storeSftpSettings({false, 22})), ""); }

    /// Dates the settings so far from now.
    void dateSettings(hours distance) const {
        const auto file = root_.path() / "etc/velt/sftp.conf";
        const timespec time{Clock::to_time_t(Clock::now() + distance), 0};
        const timespec times[]{time, time};
        ASSERT_EQ(::utimensat(AT_FDCWD, file.c_str(), times, 0), 0);
    }

    StateFolder root_;
};

TEST_F(MachineHealth, AClockBehindTheFilesIsWrong) {
    EXPECT_EQ(clockFindings(Clock::now()), Findings());
    dateSettings(hours(20));
    EXPECT_EQ(clockFindings(Clock::now()), Findings()) << "it may be off by its time zone";
    dateSettings(hours(30));
    const Findings found = clockFindings(Clock::now());
    EXPECT_EQ(summary(found), "error clock-wrong");
    EXPECT_NE(found.at(0).sentence.find("sftp.conf was written on"), std::string::npos)
        << found.at(0).sentence;
    EXPECT_EQ(found.at(0).mend, "timedatectl set-ntp true");
}

TEST_F(MachineHealth, AClockBeforeThisProgramWasMadeIsWrong) {
    const Findings found = clockFindings(Clock::time_point(std::chrono::seconds(0)));
    EXPECT_EQ(summary(found), "error clock-wrong");
    EXPECT_NE(found.at(0).sentence.find("it says 1970-01-01 00:00 UTC"), std::string::npos)
        << found.at(0).sentence;
}

/// A disk of its own below the state root.
class SmallDisk : public MachineHealth {
protected:
    void mountDisk(const std::string& options) {
        folder_ = root_.path() / "var/lib/velt";
        std::filesystem::create_directories(folder_);
        // Nobody else sees it: tests that run at the same time look at the machine's mounts.
        if (::unshare(CLONE_NEWNS) != 0 || ::mount("none", "/", nullptr, MS_REC | MS_PRIVATE, nullptr) != 0 ||
            ::mount("health", folder_.c_str(), "tmpfs", 0, options.c_str()) != 0) {
            GTEST_SKIP() << "no mounts here";
        }
        mounted_ = true;
    }
    void TearDown() override {
        if (mounted_) {
            ::umount2(folder_.c_str(), MNT_DETACH);
        }
    }

    static std::string ofThisDisk() {
        std::string text;
        for (const Finding& each : diskFindings()) {
            text += each.sentence.find("var/lib/velt,") != std::string::npos ? each.id : "";
        }
        return text;
    }

    std::filesystem::path folder_;
    bool mounted_ = false;
};

TEST_F(SmallDisk, WithRoomIsWell) {
    mountDisk("size=200m");
    EXPECT_EQ(ofThisDisk(), "");
}

TEST_F(SmallDisk, ThatIsFullIsAnError) {
    mountDisk("size=4m");
    EXPECT_EQ(ofThisDisk(), "disk-full");
}

TEST_F(SmallDisk, WithoutRoomForFilesIsAnError) {
    mountDisk("size=200m,nr_inodes=50");
    EXPECT_EQ(ofThisDisk(), "disk-full");
}

TEST_F(SmallDisk, ThatIsReadOnlyIsAnError) {
    mountDisk("size=200m");
    if (IsSkipped()) {
        return;
    }
    EXPECT_EQ(readOnlyFindings(), Findings());
    ASSERT_EQ(::mount(nullptr, folder_.c_str(), nullptr, MS_REMOUNT | MS_BIND | MS_RDONLY, nullptr), 0);
    const Findings found = readOnlyFindings();
    EXPECT_EQ(summary(found), "error state-read-only");
    EXPECT_NE(found.at(0).sentence.find("The folder " + folder_.string() + ","), std::string::npos)
        << found.at(0).sentence;
    ASSERT_EQ(runProcess({"sh", "-c", found.at(0).mend}).exitCode, 0) << found.at(0).mend;
    EXPECT_EQ(readOnlyFindings(), Findings());
}

TEST_F(SmallDisk, ThatIsAlmostFullIsAWarning) {
    mountDisk("size=200m");
    if (IsSkipped()) {
        return;
    }
    std::string text(std::size_t{185} << 20U, 'x');
    root_.write("var/lib/velt/large", text);
    EXPECT_EQ(ofThisDisk(), "disk-space");
}

} // namespace
} // namespace velt::test
