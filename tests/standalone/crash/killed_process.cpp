#include "tests/standalone/crash/killed_process.h"

#include "base/unique_fd.h"

#include <gtest/gtest.h>

#include <fcntl.h>
#include <sys/ptrace.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <csignal>
#include <cstdint>

namespace velt::test {
namespace {

// A kill before one of these leaves the same as a kill before the next call that is none of these.
bool staysInTheProcess(std::uint64_t number) {
    constexpr std::array calls{SYS_read,
                               SYS_pread64,
                               SYS_lseek,
                               SYS_mmap,
                               SYS_munmap,
                               SYS_mprotect,
                               SYS_brk,
                               SYS_madvise,
                               SYS_stat,
                               SYS_fstat,
                               SYS_lstat,
                               SYS_newfstatat,
                               SYS_statx,
                               SYS_access,
                               SYS_faccessat2,
                               SYS_getdents64,
                               SYS_readlink,
                               SYS_getcwd,
                               SYS_futex,
                               SYS_getrandom,
                               SYS_rt_sigprocmask,
                               SYS_rt_sigaction,
                               SYS_getpid,
                               SYS_gettid,
                               SYS_uname,
                               SYS_getrusage,
                               SYS_clock_gettime,
                               SYS_clock_nanosleep,
                               SYS_fcntl,
                               SYS_fstatfs,
                               SYS_ioctl,
                               SYS_sched_yield,
                               SYS_sched_getaffinity,
                               SYS_geteuid,
                               SYS_getuid,
                               SYS_sysinfo};
    return std::find(calls.begin(), calls.end(), static_cast<long>(number)) != calls.end();
}

int waitFor(pid_t child) {
    int status = 0;
    while (::waitpid(child, &status, __WALL) < 0 && errno == EINTR) {
    }
    return status;
}

/// Lets the child go on to the next entry into, or return from, a system call.
int stepToNextCall(pid_t child, int signal) {
    ::ptrace(PTRACE_SYSCALL, child, nullptr, signal);
    return waitFor(child);
}

bool entersACallOutside(pid_t child) {
    __ptrace_syscall_info info{};
    const long size = ::ptrace(PTRACE_GET_SYSCALL_INFO, child, sizeof(info), &info);
    return size > 0 && info.op == PTRACE_SYSCALL_INFO_ENTRY && !staysInTheProcess(info.entry.nr);
}

Ending follow(pid_t child, int call) {
    constexpr int callStop = SIGTRAP | 0x80; // PTRACE_O_TRACESYSGOOD
    int status = waitFor(child);
    ::ptrace(PTRACE_SETOPTIONS, child, nullptr, PTRACE_O_EXITKILL | PTRACE_O_TRACESYSGOOD);
    int signal = 0;
    for (int left = call; WIFSTOPPED(status);) {
        const bool atCall = WSTOPSIG(status) == callStop;
        if (atCall && entersACallOutside(child) && left-- == 0) {
            ::kill(child, SIGKILL);
            waitFor(child);
            return Ending::killed;
        }
        // A signal that the child would have received is handed on, but not those that stopped it for us.
        signal = atCall || WSTOPSIG(status) == SIGSTOP ? 0 : WSTOPSIG(status);
        status = stepToNextCall(child, signal);
    }
    return WIFEXITED(status) && WEXITSTATUS(status) == 0 ? Ending::succeeded : Ending::failed;
}

} // namespace

Ending killAtCall(int call, const std::function<int()>& act) {
    const pid_t child = ::fork();
    if (child == 0) {
        if (::ptrace(PTRACE_TRACEME, 0, nullptr, nullptr) != 0) {
            ::_exit(2);
        }
        ::raise(SIGSTOP);
        const int result = act();
        // The end of the process is no step of the store.
        ::syscall(SYS_exit_group, result == 0 ? 0 : 1);
    }
    return child < 0 ? Ending::failed : follow(child, call);
}

std::string tellInChild(const std::function<std::string()>& tell) {
    std::array<int, 2> ends{-1, -1};
    EXPECT_EQ(::pipe2(ends.data(), O_CLOEXEC), 0);
    const UniqueFd readEnd(ends[0]);
    UniqueFd writeEnd(ends[1]);
    const pid_t child = ::fork();
    if (child == 0) {
        const std::string text = tell();
        ::_exit(::write(writeEnd.get(), text.data(), text.size()) == static_cast<ssize_t>(text.size()) ? 0
                                                                                                       : 1);
    }
    writeEnd.reset();
    std::string told;
    std::array<char, 4096> block{};
    for (ssize_t got = 0; (got = ::read(readEnd.get(), block.data(), block.size())) > 0;) {
        told.append(block.data(), static_cast<std::size_t>(got));
    }
    EXPECT_EQ(waitFor(child), 0) << "the child ends well";
    return told;
}

} // namespace velt::test
