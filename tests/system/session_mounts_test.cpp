// The mounts that show a session what its login may see.
#include "tests/support/files.h"
#include "tests/system/support/shared_folders.h"

#include <fcntl.h>
#include <stdio.h>
#include <sys/mount.h>

#include <atomic>
#include <thread>

namespace velt::test {
namespace {
namespace fs = std::filesystem;

constexpr auto read = Access::read;
constexpr auto write = Access::write;

class SessionMounts : public SharedFolders {};

// The session that shows shares side by side; "" when there is none.
std::string sessionProcess() {
    for (const auto& entry : fs::directory_iterator("/proc")) {
        if (contentsOf(entry.path() / "mounts").find("velt-shares") != std::string::npos) {
            return entry.path().filename();
        }
    }
    return {};
}

// All mounts of the process, those outside of its root directory as well.
std::string mountsOf(const std::string& process) {
    return runProcess({"nsenter", "--target", process, "--mount", "cat", "/proc/self/mounts"}).output;
}

TEST_F(SessionMounts, areOfTheSessionAlone) {
    share("ro", {{"alice", read}});
    fs::create_directory("/mnt/srv/disk");
    ASSERT_EQ(mount("disk", "/mnt/srv/disk", "tmpfs", 0, nullptr), 0);
    // As on a server that systemd has started.
    ASSERT_EQ(mount(nullptr, "/", nullptr, MS_REC | MS_SHARED, nullptr), 0);
    const std::string before = contentsOf("/proc/self/mounts");
    start();
    {
        FtpSession session(port);
        ASSERT_EQ(session.logIn("alice"), 230);
        EXPECT_EQ(contentsOf("/proc/self/mounts"), before);
        const std::string process = sessionProcess();
        const std::string mounts = mountsOf(process);
        EXPECT_NE(mounts.find(worldRoot.string() + "/run/velt/ftp/root/ro"), std::string::npos) << mounts;
        EXPECT_NE(mounts.find("/mnt/srv/disk"), std::string::npos) << mounts;
        EXPECT_EQ(umount("/mnt/srv/disk"), 0);
        EXPECT_EQ(mountsOf(process).find("/mnt/srv/disk"), std::string::npos)
            << "an open session must not keep what the server has unmounted";
        EXPECT_EQ(session.receive("RETR /ro/file"), "ro");
        session.command("QUIT");
    }
    stop();
    EXPECT_EQ(sessionProcess(), "");
    EXPECT_EQ(mount(nullptr, "/", nullptr, MS_REC | MS_PRIVATE, nullptr), 0);
    EXPECT_TRUE(fs::is_empty(worldRoot / "run/velt/ftp/root"));
}

TEST_F(SessionMounts, areOfTheRightFolderWhileSomebodyMovesIt) {
    const auto music = share("music", {{"alice", write}});
    fs::create_directory(music / "mine");
    writeFile(music / "mine/right", "x");
    fs::create_directory("/mnt/srv/outside");
    writeFile("/mnt/srv/outside/wrong", "x");
    start();
    storeRules({"u:1001:/music/mine"});
    std::atomic<bool> done = false;
    // Each moment there stands either the folder or a link that leads out.
    std::thread mover([&] {
        fs::create_directory_symlink("../outside", music / "link");
        while (!done) {
            renameat2(AT_FDCWD, (music / "mine").c_str(), AT_FDCWD, (music / "link").c_str(),
                      RENAME_EXCHANGE);
            std::this_thread::sleep_for(std::chrono::microseconds(300));
        }
    });
    int granted = 0;
    for (int i = 0; i < 20; i++) {
        FtpSession session(port);
        if (session.logIn("alice") == 230) {
            granted++;
            EXPECT_EQ(seenIn(session, "/"), "right");
        }
    }
    done = true;
    mover.join();
    EXPECT_GT(granted, 0);
}

TEST_F(SessionMounts, areOfNoClosedFolderWhileSomebodyMovesAShare) {
    const auto music = share("music", {{"alice", write}});
    const auto inner = share("inner", {{"alice", write}}, {}, music / "inner");
    fs::create_directories("/mnt/closed/open");
    writeFile("/mnt/closed/open/wrong", "x");
    fs::permissions("/mnt/closed", fs::perms(0700));
    start();
    storeRules({"u:1001:/inner"});
    std::atomic<bool> done = false;
    // Each moment there stands either the folder or a link to one that alice cannot get to.
    std::thread mover([&] {
        fs::create_directory_symlink("/mnt/closed/open", music / "link");
        while (!done) {
            renameat2(AT_FDCWD, inner.c_str(), AT_FDCWD, (music / "link").c_str(), RENAME_EXCHANGE);
            std::this_thread::sleep_for(std::chrono::microseconds(300));
        }
    });
    int granted = 0;
    for (int i = 0; i < 40; i++) {
        FtpSession session(port);
        if (session.logIn("alice") == 230) {
            granted++;
            EXPECT_EQ(seenIn(session, "/"), "file");
        }
    }
    done = true;
    mover.join();
    EXPECT_GT(granted, 0);
}

} // namespace
} // namespace velt::test
