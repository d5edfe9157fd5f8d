#include "tests/support/call_watch.h"

#include "tests/support/files.h"
#include "tests/support/watched_calls.h"

#include <fcntl.h>
#include <linux/filter.h>
#include <linux/seccomp.h>
#include <poll.h>
#include <sched.h>
#include <sys/eventfd.h>
#include <sys/ioctl.h>
#include <sys/mman.h>
#include <sys/prctl.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>

#include <array>
#include <atomic>
#include <climits>
#include <csignal>
#include <cstddef>
#include <cstring>
#include <filesystem>
#include <stdexcept>
#include <vector>

namespace velt::test {

/// What the child and this process have in common, so that the child needs no call to speak.
struct CallWatch::Shared {
    static constexpr int notYet = -2;
    std::atomic<int> listener{notYet}; ///< the child's number for it; -1: there is none
    std::atomic<bool> taken{false};
    std::atomic<bool> hasTold{false};
    std::size_t length = 0;
    std::array<char, std::size_t{1} << 20> told{};
};

namespace {

/// Has the kernel ask about the watched calls; the descriptor on which it asks, or -1.
int installFilter() {
    const auto watched = watchedCalls();
    std::vector<sock_filter> program;
    program.push_back(BPF_STMT(BPF_LD | BPF_W | BPF_ABS, offsetof(seccomp_data, nr)));
    for (std::size_t i = 0; i < watched.size(); ++i) {
        const auto toTheEnd = static_cast<unsigned char>(watched.size() - i);
        program.push_back(
            BPF_JUMP(BPF_JMP | BPF_JEQ | BPF_K, static_cast<unsigned>(watched[i].number), toTheEnd, 0));
    }
    program.push_back(BPF_STMT(BPF_RET | BPF_K, SECCOMP_RET_ALLOW));
    program.push_back(BPF_STMT(BPF_RET | BPF_K, SECCOMP_RET_USER_NOTIF));
    const sock_fprog filter{static_cast<unsigned short>(program.size()), program.data()};
    if (::geteuid() != 0) {
        ::prctl(PR_SET_NO_NEW_PRIVS, 1, 0, 0, 0);
    }
    return static_cast<int>(
        ::syscall(SYS_seccomp, SECCOMP_SET_MODE_FILTER,
                  SECCOMP_FILTER_FLAG_NEW_LISTENER | SECCOMP_FILTER_FLAG_WAIT_KILLABLE_RECV, &filter));
}

std::string procFile(pid_t process, const std::string& name) {
    return "/proc/" + std::to_string(process) + "/" + name;
}

std::string linkTarget(const std::string& path) {
    std::error_code error;
    return std::filesystem::read_symlink(path, error).string();
}

/// The text at an address of another process, which waits.
std::string textAt(pid_t process, std::uint64_t address) {
    const UniqueFd memory(::open(procFile(process, "mem").c_str(), O_RDONLY | O_CLOEXEC));
    std::array<char, PATH_MAX> text{};
    // Up to the end of its page first: the next one may not be there.
    const std::size_t room = 4096 - address % 4096;
    const ssize_t got =
        ::pread(memory.get(), text.data(), std::min(room, text.size() - 1), static_cast<off_t>(address));
    if (got == static_cast<ssize_t>(room) && std::memchr(text.data(), 0, room) == nullptr) {
        (void)::pread(memory.get(), text.data() + room, text.size() - 1 - room,
                      static_cast<off_t>(address + room));
    }
    return text.data();
}

std::string placeOf(pid_t process, std::uint64_t descriptor) {
    const int number = static_cast<int>(descriptor);
    return linkTarget(procFile(process, number == AT_FDCWD ? "cwd" : "fd/" + std::to_string(number)));
}

std::string pathBelow(pid_t process, std::uint64_t folder, std::uint64_t address) {
    const std::string path = textAt(process, address);
    if (path.starts_with('/')) {
        return path;
    }
    return path.empty() ? placeOf(process, folder) : placeOf(process, folder) + "/" + path;
}

std::string subjectOf(const WatchedCall& call, const seccomp_notif& request) {
    const auto process = static_cast<pid_t>(request.pid);
    const auto* const arguments = request.data.args;
    switch (call.subject) {
    case CallSubject::path:
        return textAt(process, arguments[0]);
    case CallSubject::pathAt:
        return pathBelow(process, arguments[0], arguments[1]);
    case CallSubject::pathAtEnd:
        return textAt(process, arguments[1]);
    case CallSubject::descriptor:
        return placeOf(process, arguments[0]);
    case CallSubject::none:
        break;
    }
    return {};
}

SeenCall describe(const seccomp_notif& request, pid_t child) {
    const WatchedCall& call = watchedCall(request.data.nr);
    const auto process = static_cast<pid_t>(request.pid);
    std::string program = contentsOf(procFile(process, "comm"));
    program.resize(program.empty() ? 0 : program.size() - 1);
    const bool ofChild =
        process == child || std::filesystem::exists(procFile(child, "task/" + std::to_string(process)));
    return {call.name, subjectOf(call, request), program, ofChild, call.error};
}

/// What the function returns, or what it threw.
std::string toldBy(const std::function<std::string()>& act) {
    try {
        return act();
    } catch (const std::exception& exception) {
        return std::string("threw: ") + exception.what();
    }
}

/// These two report no failure: they return the number from before, and change nothing.
bool failsInSilence(int number) {
    return number == SYS_setfsuid || number == SYS_setfsgid;
}

} // namespace

CallWatch::CallWatch(const std::function<std::string()>& act, Decide decide)
    : wake_(::eventfd(0, EFD_CLOEXEC)), decide_(std::move(decide)) {
    void* const memory =
        ::mmap(nullptr, sizeof(Shared), PROT_READ | PROT_WRITE, MAP_SHARED | MAP_ANONYMOUS, -1, 0);
    if (memory == MAP_FAILED) {
        throw std::runtime_error("cannot share memory with a child");
    }
    shared_ = new (memory) Shared;
    child_ = ::fork();
    if (child_ == 0) {
        const int listener = installFilter();
        shared_->listener = listener;
        while (!shared_->taken) {
            ::sched_yield();
        }
        ::close(listener);
        const std::string told = toldBy(act);
        shared_->length = told.copy(shared_->told.data(), shared_->told.size());
        shared_->hasTold = true;
        ::_exit(0);
    }
    while (shared_->listener == Shared::notYet) {
        ::sched_yield();
    }
    const UniqueFd process(static_cast<int>(::syscall(SYS_pidfd_open, child_, 0)));
    listener_ =
        UniqueFd(static_cast<int>(::syscall(SYS_pidfd_getfd, process.get(), shared_->listener.load(), 0)));
    if (!listener_) {
        ::kill(child_, SIGKILL);
        ::waitpid(child_, nullptr, 0);
        throw std::runtime_error("the kernel does not tell of system calls");
    }
    thread_ = std::thread([this] { answerCalls(); });
    shared_->taken = true;
}

CallWatch::~CallWatch() {
    if (!finished_) {
        finish(std::chrono::milliseconds(0));
    }
    const std::uint64_t one = 1;
    (void)::write(wake_.get(), &one, sizeof one);
    thread_.join();
    ::munmap(shared_, sizeof(Shared));
}

void CallWatch::answerCalls() {
    for (;;) {
        std::array<pollfd, 2> waiting{pollfd{listener_.get(), POLLIN, 0}, pollfd{wake_.get(), POLLIN, 0}};
        ::poll(waiting.data(), waiting.size(), -1);
        if ((waiting[0].revents & POLLIN) != 0) {
            answerOne();
        } else if (waiting[0].revents != 0 || waiting[1].revents != 0) {
            return;
        }
    }
}

void CallWatch::answerOne() {
    seccomp_notif request{};
    if (::ioctl(listener_.get(), SECCOMP_IOCTL_NOTIF_RECV, &request) != 0) {
        return; // it was killed meanwhile
    }
    seccomp_notif_resp answer{};
    answer.id = request.id;
    answer.flags = SECCOMP_USER_NOTIF_FLAG_CONTINUE;
    const std::lock_guard lock(mutex_);
    const int error = decide_ ? decide_(describe(request, child_)) : 0;
    if (error != 0) {
        decide_ = {};
        answer.flags = 0;
        answer.error = failsInSilence(request.data.nr) ? 0 : -error;
    }
    ::ioctl(listener_.get(), SECCOMP_IOCTL_NOTIF_SEND, &answer);
}

void CallWatch::decideBy(Decide decide) {
    const std::lock_guard lock(mutex_);
    decide_ = std::move(decide);
}

ChildEnd CallWatch::finish(std::chrono::milliseconds limit) {
    finished_ = true;
    ChildEnd end;
    const UniqueFd process(static_cast<int>(::syscall(SYS_pidfd_open, child_, 0)));
    pollfd ended{process.get(), POLLIN, 0};
    end.inTime = ::poll(&ended, 1, static_cast<int>(limit.count())) == 1;
    if (!end.inTime) {
        ::kill(child_, SIGKILL);
    }
    ::waitpid(child_, &end.status, 0);
    if (shared_->hasTold) {
        end.told.assign(shared_->told.data(), shared_->length);
    }
    return end;
}

} // namespace velt::test
