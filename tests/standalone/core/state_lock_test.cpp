#include "base/file.h"
#include "base/file_lock.h"
#include "base/unique_fd.h"
#include "standalone/core/state_lock.h"
#include "tests/standalone/support/state_folder.h"
#include "tests/support/result.h"

#include <gtest/gtest.h>

#include <fcntl.h>
#include <sys/wait.h>
#include <unistd.h>

#include <atomic>
#include <chrono>
#include <thread>
#include <vector>

namespace velt {
namespace {

class Lock : public ::testing::Test {
protected:
    test::StateFolder root_;
    std::filesystem::path counter_ = root_.path() / "counter";

    // Reads, adds one, writes: loses updates unless the lock holds.
    bool addOne() const {
        const auto lock = StateLock::take();
        if (!lock)
            return false;
        const int count = std::stoi(readFile(counter_).valueOr("0"));
        return bool(replaceFile(counter_, std::to_string(count + 1), 0644));
    }
};

TEST_F(Lock, MayBeTakenAgainByItsThread) {
    const auto outer = StateLock::take();
    ASSERT_TRUE(outer);
    {
        const auto inner = StateLock::take();
        EXPECT_TRUE(inner);
    }
    const auto again = StateLock::take();
    EXPECT_TRUE(again);
}

TEST_F(Lock, OfAFileIsNotWaitedForForEver) {
    const auto file = root_.path() / "operation";
    const auto openFile = [&] { return UniqueFd(::open(file.c_str(), O_RDWR | O_CREAT | O_CLOEXEC, 0600)); };
    const UniqueFd holder = openFile();
    const UniqueFd waiter = openFile();
    ASSERT_TRUE(waitForFileLock(holder.get(), file));
    EXPECT_EQ(test::messageOf(waitForFileLock(waiter.get(), file, std::chrono::milliseconds(50))),
              "Cannot lock " + file.string() + ": another process has held it for 50 ms.");
}

TEST_F(Lock, KeepsOtherThreadsOutUntilTheOutermostGoes) {
    std::atomic<bool> entered = false;
    std::thread other;
    {
        const auto outer = StateLock::take();
        { const auto inner = StateLock::take(); }
        other = std::thread([&] {
            const auto lock = StateLock::take();
            entered = static_cast<bool>(lock);
        });
        std::this_thread::sleep_for(std::chrono::milliseconds(50));
        EXPECT_FALSE(entered);
    }
    other.join();
    EXPECT_TRUE(entered);
}

TEST_F(Lock, ThreadsThatUpdateAtOnceLoseNothing) {
    std::vector<std::thread> threads;
    for (int i = 0; i < 4; ++i)
        threads.emplace_back([this] {
            for (int n = 0; n < 50; ++n)
                EXPECT_TRUE(addOne());
        });
    for (auto& thread : threads)
        thread.join();
    EXPECT_EQ(readFile(counter_), "200");
}

TEST_F(Lock, ProcessesThatUpdateAtOnceLoseNothing) {
    std::vector<pid_t> children;
    for (int i = 0; i < 2; ++i) {
        children.push_back(::fork());
        if (children.back() == 0) {
            for (int n = 0; n < 200; ++n)
                if (!addOne())
                    ::_exit(1);
            ::_exit(0);
        }
    }
    for (const pid_t child : children) {
        int status = -1;
        ASSERT_EQ(::waitpid(child, &status, 0), child);
        EXPECT_EQ(status, 0);
    }
    EXPECT_EQ(readFile(counter_), "400");
}

TEST_F(Lock, IsFreeAgainWhenItsHolderIsKilled) {
    const pid_t child = ::fork();
    if (child == 0) {
        const auto lock = StateLock::take();
        ::kill(::getpid(), SIGKILL);
    }
    int status = 0;
    ASSERT_EQ(::waitpid(child, &status, 0), child);
    ASSERT_TRUE(WIFSIGNALED(status));
    const auto lock = StateLock::take();
    EXPECT_TRUE(lock);
}

TEST_F(Lock, SaysWhyItCannotBeHad) {
    root_.write("var", "a file where a folder should be");
    EXPECT_EQ(test::messageOf(StateLock::take()),
              "Cannot lock " + root_.path().string() + "/var/lib/velt/lock: Not a directory.");
}

} // namespace
} // namespace velt
