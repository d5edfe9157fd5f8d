#include "tests/system/support/systemd_world.h"

#include "base/unique_fd.h"
#include "tests/support/run_program.h"
#include "tests/support/waiting.h"
#include "tests/system/support/systemd_root.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <sched.h>
#include <sys/mount.h>
#include <sys/prctl.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <chrono>
#include <csignal>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <iostream>
#include <optional>
#include <sstream>

namespace velt::test {
namespace {
namespace fs = std::filesystem;
using std::chrono::milliseconds;
using std::chrono::seconds;

constexpr const char* groupPrefix = "velt-test-";

/// Where in the second version's hierarchy of control groups this process is; nothing where there is none.
std::optional<fs::path> ownGroup() {
    std::ifstream mounts("/proc/self/mounts");
    for (std::string line; std::getline(mounts, line);) {
        std::istringstream fields(line);
        std::string device, place, type;
        fields >> device >> place >> type;
        if (type != "cgroup2") {
            continue;
        }
        std::ifstream groups("/proc/self/cgroup");
        for (std::string group; std::getline(groups, group);) {
            if (group.starts_with("0::/")) {
                return fs::path(place) / group.substr(4);
            }
        }
    }
    return std::nullopt;
}

/// Removes the group with those below it; one in which something runs stays.
void removeGroup(const fs::path& group) {
    std::error_code error;
    for (const auto& entry : fs::directory_iterator(group, error)) {
        if (entry.is_directory(error) && !entry.is_symlink(error)) {
            removeGroup(entry.path());
        }
    }
    ::rmdir(group.c_str());
}

/// A group for this process; those of tests that were killed are removed.
std::string makeGroup() {
    const auto parent = ownGroup();
    if (!parent) {
        throw NoSystemd("no control groups of the second version are mounted");
    }
    for (const auto& entry : fs::directory_iterator(*parent)) {
        const std::string name = entry.path().filename();
        if (name.starts_with(groupPrefix) && !fs::exists("/proc/" + name.substr(std::strlen(groupPrefix)))) {
            removeGroup(entry.path());
        }
    }
    const fs::path group = *parent / (groupPrefix + std::to_string(::getpid()));
    if (::mkdir(group.c_str(), 0755) < 0) {
        throw NoSystemd("no control group can be made: " + std::string(std::strerror(errno)));
    }
    return group;
}

int exitCodeOf(pid_t child) {
    int status = 0;
    while (::waitpid(child, &status, 0) < 0 && errno == EINTR) {
    }
    return WIFEXITED(status) ? WEXITSTATUS(status) : 128 + WTERMSIG(status);
}

/// What becomes the machine's first process. Returns only when that fails.
void becomeInit(const std::string& group, int report) {
    try {
        ::prctl(PR_SET_PDEATHSIG, SIGKILL); // the kernel keeps this over the exec
        enterSystemdRoot(group);
        const UniqueFd null(::open("/dev/null", O_RDWR | O_CLOEXEC));
        for (const int standard : {STDIN_FILENO, STDOUT_FILENO, STDERR_FILENO}) {
            ::dup2(null.get(), standard);
        }
        ::setsid();
        sigset_t none;
        sigemptyset(&none);
        ::sigprocmask(SIG_SETMASK, &none, nullptr);
        const char* environment[] = {"container=other", "PATH=/usr/sbin:/usr/bin:/sbin:/bin", nullptr};
        const char* arguments[] = {"/lib/systemd/systemd", "--system", "--unit=multi-user.target", nullptr};
        ::execve(arguments[0], const_cast<char**>(arguments), const_cast<char**>(environment));
        throw std::runtime_error(std::string(arguments[0]) + ": " + std::strerror(errno));
    } catch (const std::exception& error) {
        const std::string text = error.what();
        [[maybe_unused]] const auto written = ::write(report, text.data(), text.size());
    }
}

} // namespace

SystemdWorld::SystemdWorld() {
    if (::geteuid() != 0) {
        throw NoSystemd("only root can boot a machine of its own");
    }
    if (!fs::exists("/lib/systemd/systemd")) {
        throw NoSystemd("systemd is not installed");
    }
    makeSystemdRoot();
    group_ = makeGroup();
    try {
        boot();
    } catch (const std::runtime_error&) {
        end();
        throw;
    }
}

SystemdWorld::~SystemdWorld() {
    end();
}

void SystemdWorld::boot() {
    std::array<int, 2> ends{-1, -1};
    if (::pipe2(ends.data(), O_CLOEXEC) != 0) {
        throw std::runtime_error("no pipe");
    }
    const UniqueFd readEnd(ends[0]);
    UniqueFd writeEnd(ends[1]);
    constexpr long spaces = CLONE_NEWNS | CLONE_NEWPID | CLONE_NEWNET | CLONE_NEWUTS | CLONE_NEWIPC | SIGCHLD;
    init_ = static_cast<pid_t>(::syscall(SYS_clone, spaces, nullptr, nullptr, nullptr, nullptr));
    if (init_ == 0) {
        becomeInit(group_, writeEnd.get());
        ::_exit(1);
    }
    if (init_ < 0) {
        throw NoSystemd("no name spaces can be made: " + std::string(std::strerror(errno)));
    }
    writeEnd.reset();
    std::array<char, 1000> text{};
    const ssize_t length = ::read(readEnd.get(), text.data(), text.size());
    if (length > 0) {
        throw NoSystemd("the machine cannot be made: " +
                        std::string(text.data(), static_cast<std::size_t>(length)));
    }
    waitUntilBooted();
}

void SystemdWorld::waitUntilBooted() {
    const bool booted = inside([] {
        waitUntil([] { return fs::exists("/run/systemd/private"); }, seconds(20));
        const std::string state =
            runProcess({"systemctl", "is-system-running", "--wait"}, {}, seconds(30)).output;
        // What else may fail on a machine like this one is not what the tests are about.
        if (state != "running\n" && state != "degraded\n") {
            ADD_FAILURE() << state << runProcess({"systemctl", "list-jobs", "--no-pager"}).output;
        }
    });
    if (!booted) {
        throw std::runtime_error("the machine does not boot");
    }
}

bool SystemdWorld::inside(const std::function<void()>& act) {
    std::cout.flush();
    const pid_t guide = ::fork();
    if (guide == 0) {
        const UniqueFd machine(static_cast<int>(::syscall(SYS_pidfd_open, init_, 0)));
        if (::setns(machine.get(), CLONE_NEWPID | CLONE_NEWNS | CLONE_NEWNET | CLONE_NEWUTS | CLONE_NEWIPC |
                                       CLONE_NEWCGROUP) < 0) {
            std::cerr << "the machine cannot be entered: " << std::strerror(errno) << '\n';
            ::_exit(1);
        }
        ::prctl(PR_SET_PDEATHSIG, SIGKILL);
        const pid_t child = ::fork(); // the first process that the machine sees
        if (child != 0) {
            ::_exit(child < 0 ? 1 : exitCodeOf(child));
        }
        ::prctl(PR_SET_PDEATHSIG, SIGKILL);
        act();
        std::cout.flush();
        ::_exit(testing::Test::HasFailure() ? 1 : 0);
    }
    return guide > 0 && exitCodeOf(guide) == 0;
}

void SystemdWorld::reboot() {
    inside([] { runProcess({"systemctl", "reboot"}); });
    if (!waitUntil([this] { return ::waitpid(init_, nullptr, WNOHANG) == init_; }, seconds(30))) {
        throw std::runtime_error("the machine does not shut down");
    }
    init_ = -1;
    boot();
}

void SystemdWorld::end() {
    if (init_ > 0) {
        ::kill(init_, SIGKILL); // and the kernel ends whatever runs with it
        ::waitpid(init_, nullptr, 0);
        init_ = -1;
    }
    removeSystemdRoot();
    removeGroup(group_);
}

} // namespace velt::test
