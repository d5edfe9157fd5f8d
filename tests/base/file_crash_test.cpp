// A store interrupted at each of its system calls: the linker puts the functions below in the place of the
// calls.
#include "base/file.h"
#include "tests/support/result.h"
#include "tests/support/temporary_folder.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <signal.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <cstdarg>
#include <cstring>
#include <iterator>
#include <set>

namespace {

enum class Trouble {
    none,
    killBefore, ///< the process is killed in the place of the call
    killHalf,   ///< of a write, half is done first
    failCall,   ///< the call fails with EIO
};

Trouble trouble = Trouble::none;
int callsUntilTrouble = 0;
bool troubleCame = false;
std::string troubledCall;

std::string brokenCall; ///< always fails

bool isBroken(const char* call) {
    errno = EIO;
    return brokenCall == call;
}

bool isTroubled(const char* call) {
    if (trouble == Trouble::none || callsUntilTrouble-- != 0)
        return false;
    troubleCame = true;
    troubledCall = call;
    if (trouble == Trouble::killBefore || (trouble == Trouble::killHalf && troubledCall != "write"))
        ::kill(::getpid(), SIGKILL);
    errno = EIO;
    return true;
}

} // namespace

extern "C" {

int __real_open(const char* path, int flags, ...);
int __real_mkdir(const char* path, mode_t mode);
int __real_flock(int fd, int operation);
int __real_fstat(int fd, struct stat* status);
int __real_lstat(const char* path, struct stat* status);
int __real_ftruncate(int fd, off_t length);
int __real_fchmod(int fd, mode_t mode);
ssize_t __real_write(int fd, const void* data, size_t size);
int __real_fsync(int fd);
int __real_rename(const char* from, const char* to);

int __wrap_open(const char* path, int flags, ...) {
    va_list arguments;
    va_start(arguments, flags);
    const mode_t mode = (flags & O_CREAT) != 0 ? va_arg(arguments, mode_t) : 0;
    va_end(arguments);
    return isTroubled("open") ? -1 : __real_open(path, flags, mode);
}
int __wrap_mkdir(const char* path, mode_t mode) {
    return isTroubled("mkdir") ? -1 : __real_mkdir(path, mode);
}
int __wrap_flock(int fd, int operation) {
    return isTroubled("flock") ? -1 : __real_flock(fd, operation);
}
int __wrap_fstat(int fd, struct stat* status) {
    return isBroken("fstat") ? -1 : __real_fstat(fd, status);
}
int __wrap_lstat(const char* path, struct stat* status) {
    return isBroken("lstat") ? -1 : __real_lstat(path, status);
}
int __wrap_ftruncate(int fd, off_t length) {
    return isTroubled("ftruncate") ? -1 : __real_ftruncate(fd, length);
}
int __wrap_fchmod(int fd, mode_t mode) {
    return isTroubled("fchmod") ? -1 : __real_fchmod(fd, mode);
}
ssize_t __wrap_write(int fd, const void* data, size_t size) {
    if (!isTroubled("write"))
        return __real_write(fd, data, size);
    if (trouble == Trouble::killHalf) {
        __real_write(fd, data, size / 2);
        ::kill(::getpid(), SIGKILL);
    }
    return -1;
}
int __wrap_fsync(int fd) {
    return isTroubled("fsync") ? -1 : __real_fsync(fd);
}
int __wrap_rename(const char* from, const char* to) {
    return isTroubled("rename") ? -1 : __real_rename(from, to);
}
}

namespace velt {
namespace {

const std::string oldContents(10'000, 'o');
const std::string newContents(20'000, 'n');

class FileCrash : public ::testing::Test {
protected:
    test::TemporaryFolder folder_;
    std::filesystem::path file_ = folder_.path() / "folder" / "file";

    void TearDown() override {
        trouble = Trouble::none;
        brokenCall.clear();
    }

    // Whether the store was killed at its n-th call; false once it has fewer calls.
    bool isKilledAt(int call, Trouble kind) const {
        const pid_t child = ::fork();
        if (child == 0) {
            trouble = kind;
            callsUntilTrouble = call;
            ::_exit(replaceFile(file_, newContents, 0644) ? 0 : 1);
        }
        int status = 0;
        EXPECT_EQ(::waitpid(child, &status, 0), child);
        if (WIFSIGNALED(status))
            return true;
        EXPECT_EQ(WEXITSTATUS(status), 0);
        return false;
    }

    void expectStoreCleansUp() const {
        ASSERT_TRUE(replaceFile(file_, oldContents, 0644));
        EXPECT_EQ(readFile(file_), oldContents);
        const std::filesystem::directory_iterator entries(file_.parent_path());
        EXPECT_EQ(std::distance(begin(entries), end(entries)), 1);
    }
};

TEST_F(FileCrash, KilledAnywhereLeavesTheOldOrTheNewFileWhole) {
    std::set<std::string> seen;
    int call = 0;
    ASSERT_TRUE(replaceFile(file_, oldContents, 0644));
    while (isKilledAt(call, Trouble::killBefore)) {
        const auto contents = readFile(file_);
        ASSERT_TRUE(contents == oldContents || contents == newContents) << "after call " << call;
        seen.insert(*contents);
        expectStoreCleansUp();
        ++call;
    }
    // open, flock, ftruncate, fchmod, write, fsync, rename, and open and fsync of the folder.
    EXPECT_EQ(call, 9);
    EXPECT_EQ(seen.size(), 2U) << "both outcomes occur";
}

TEST_F(FileCrash, KilledWithinTheWriteLeavesTheOldFileWhole) {
    ASSERT_TRUE(replaceFile(file_, oldContents, 0644));
    ASSERT_TRUE(isKilledAt(4, Trouble::killHalf));

    EXPECT_EQ(std::filesystem::file_size(file_.parent_path() / ".file.new"), newContents.size() / 2);
    EXPECT_EQ(readFile(file_), oldContents);
    expectStoreCleansUp();
}

TEST_F(FileCrash, KilledAnywhereInTheFirstStoreLeavesNoFileOrTheWholeFile) {
    int call = 0;
    for (; isKilledAt(call, Trouble::killBefore); ++call) {
        const auto contents = readFile(file_);
        ASSERT_TRUE(!contents || contents == newContents) << "after call " << call;
        std::filesystem::remove_all(file_.parent_path());
    }
    EXPECT_EQ(call, 12) << "mkdir, open and fsync come first";
}

TEST_F(FileCrash, EachFailedCallIsReportedAndLeavesAWholeFile) {
    std::set<std::string> failedCalls;
    for (int call = 0;; ++call) {
        ASSERT_TRUE(replaceFile(file_, oldContents, 0644));
        trouble = Trouble::failCall;
        callsUntilTrouble = call;
        troubleCame = false;
        const auto result = replaceFile(file_, newContents, 0644);
        trouble = Trouble::none;
        if (!troubleCame) {
            EXPECT_TRUE(result);
            break;
        }
        failedCalls.insert(troubledCall);
        EXPECT_NE(test::messageOf(result).find(std::strerror(EIO)), std::string::npos)
            << troubledCall << ": " << test::messageOf(result);
        const auto contents = readFile(file_);
        EXPECT_TRUE(contents == oldContents || contents == newContents) << troubledCall;
    }
    EXPECT_EQ(failedCalls,
              (std::set<std::string>{"open", "flock", "ftruncate", "fchmod", "write", "fsync", "rename"}));
}

TEST_F(FileCrash, WhatCannotBeLookedAtIsNotTriedForEver) {
    ASSERT_TRUE(replaceFile(file_, oldContents, 0644));
    for (const char* call : {"fstat", "lstat"}) {
        brokenCall = call;
        const auto result = replaceFile(file_, newContents, 0644);
        brokenCall.clear();
        EXPECT_NE(test::messageOf(result).find(std::strerror(EIO)), std::string::npos) << call;
        EXPECT_EQ(readFile(file_), oldContents);
    }
    expectStoreCleansUp();
}

} // namespace
} // namespace velt
