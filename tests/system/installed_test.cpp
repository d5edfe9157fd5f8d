// An installation at work: its parts find each other without being told where they are.
#include "tests/support/files.h"
#include "tests/support/run_program.h"
#include "tests/system/support/files.h"
#include "tests/system/support/leftovers.h"
#include "tests/system/support/private_world.h"

#include <gtest/gtest.h>

#include <filesystem>
#include <string>

namespace velt::test {
namespace {
namespace fs = std::filesystem;

const fs::path prefix = "/mnt/prefix";

ProcessResult shell(const std::string& commands) {
    return runProcess({"bash", "-c", "cd " + prefix.string() + "\n" + commands}, {},
                      std::chrono::seconds(60));
}

class InstalledPrograms : public testing::Test {
protected:
    void SetUp() override {
        if (!whyNoWorld().empty()) {
            GTEST_SKIP() << whyNoWorld();
        }
        const ProcessResult made =
            runProcess({VELT_CMAKE, "--install", VELT_BUILT_FOLDER, "--prefix", prefix.string()}, {},
                       std::chrono::seconds(60));
        ASSERT_EQ(made.exitCode, 0) << made.errors;
        furnishHomes();
    }
    void TearDown() override {
        if (!whyNoWorld().empty()) {
            return;
        }
        shell("kill $(cat veltd.pid)");
        EXPECT_EQ(lastingProcesses(), "");
        fs::remove_all(prefix);
        clearFolders();
    }
};

TEST_F(InstalledPrograms, serveRealUsers) {
    // As the unit has it, but for the state root.
    const ProcessResult started =
        shell("words=$(sed -n 's/^ExecStart=//p' lib/systemd/system/veltd.service)\n"
              "${words% *} --state-root /mnt/root >veltd.log 2>&1 & echo $! >veltd.pid\n"
              "for _ in $(seq 100); do [ -S /mnt/root/run/velt/veltd.sock ] && break; sleep 0.05; done\n"
              "export VELT_SOCKET=/mnt/root/run/velt/veltd.sock\n"
              "bin/veltctl ftp set enable_ftp=on portnum=2121\n"
              "curl -sS ftp://127.0.0.1:2121/ --user alice:alice-secret | grep -o 'home-of'\n"
              "bin/veltctl security set user_chroot=on\n"
              "curl -sS ftp://127.0.0.1:2121/home-of --user alice:alice-secret\n"
              "bin/veltctl ftp set enable_ftp=off\n");
    // Users who are not confined see the shares, of which there are none; the confined see their homes.
    EXPECT_EQ(started.output, "enable_ftp: off -> on\nportnum: 21 -> 2121\nuser_chroot: off -> on\nalice"
                              "enable_ftp: on -> off\n")
        << started.errors << contentsOf(prefix / "veltd.log");
}

} // namespace
} // namespace velt::test
