// Processes, told apart from those that come after them.
#include "standalone/process/process_identity.h"

#include "base/unique_fd.h"
#include "tests/support/files.h"
#include "tests/support/waiting.h"

#include <gtest/gtest.h>

#include <fcntl.h>
#include <sys/prctl.h>
#include <sys/resource.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>

#include <string>
#include <thread>

namespace velt::test {
namespace {

TEST(Processes, AreToldApartByTheirStart) {
    const auto self = identifyProcess(::getpid());
    ASSERT_TRUE(self);
    EXPECT_TRUE(isAlive(*self));
    EXPECT_FALSE(isAlive({self->pid, self->startTime + 1}));
    EXPECT_FALSE(isAlive({}));
    EXPECT_FALSE(identifyProcess(-1));
}

TEST(Processes, MayBeAliveWhileTheyCannotBeLookedAt) {
    const auto self = identifyProcess(::getpid());
    ASSERT_TRUE(self);
    rlimit usual{};
    ASSERT_EQ(getrlimit(RLIMIT_NOFILE, &usual), 0);
    const rlimit none{0, usual.rlim_max};
    ASSERT_EQ(setrlimit(RLIMIT_NOFILE, &none), 0); // no file can be opened
    const bool alive = isAlive(*self);
    ASSERT_EQ(setrlimit(RLIMIT_NOFILE, &usual), 0);
    EXPECT_TRUE(alive) << "who takes it for gone leaves it behind";
}

TEST(Processes, CannotForgeTheirStartByTheirName) {
    UniqueFd alive;
    UniqueFd end;
    int ends[2];
    ASSERT_EQ(pipe2(ends, O_CLOEXEC), 0);
    UniqueFd toParent(ends[1]);
    alive = UniqueFd(ends[0]);
    ASSERT_EQ(pipe2(ends, O_CLOEXEC), 0);
    end = UniqueFd(ends[1]);
    const UniqueFd wait(ends[0]);
    const pid_t child = fork();
    if (child == 0) {
        char byte = 0;
        prctl(PR_SET_NAME, "a) Z 1 1 (b");
        end.reset();
        _exit(write(toParent.get(), "x", 1) == 1 && read(wait.get(), &byte, 1) == 0 ? 0 : 1);
    }
    char byte = 0;
    ASSERT_EQ(read(alive.get(), &byte, 1), 1);
    const auto named = identifyProcess(child);
    ASSERT_TRUE(named);
    EXPECT_EQ(named->pid, child);
    EXPECT_TRUE(isAlive(*named)) << "it says that it is a zombie";
    end.reset();
    EXPECT_EQ(waitpid(child, nullptr, 0), child);
    EXPECT_FALSE(isAlive(*named));
}

TEST(Processes, LiveUntilTheirLastThreadEnds) {
    int ends[2];
    ASSERT_EQ(pipe2(ends, O_CLOEXEC), 0);
    const UniqueFd wait(ends[0]);
    UniqueFd end(ends[1]);
    const pid_t child = fork();
    if (child == 0) {
        end.reset();
        std::thread([&wait] {
            char byte = 0;
            _exit(read(wait.get(), &byte, 1) == 0 ? 0 : 1);
        }).detach();
        syscall(SYS_exit, 0); // of this thread alone
    }
    const auto process = identifyProcess(child);
    ASSERT_TRUE(process);
    const auto looksEnded = [child] {
        return contentsOf("/proc/" + std::to_string(child) + "/stat").find(") Z ") != std::string::npos;
    };
    EXPECT_TRUE(waitUntil(looksEnded, patience));
    EXPECT_TRUE(isAlive(*process)) << "it has its files and ports";
    end.reset();
    EXPECT_EQ(waitpid(child, nullptr, 0), child);
    EXPECT_FALSE(isAlive(*process));
}

} // namespace
} // namespace velt::test
