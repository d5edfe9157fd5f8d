#include "standalone/process/run_program.h"

#include "base/spawn_setup.h"
#include "base/unique_fd.h"

#include <fcntl.h>
#include <poll.h>
#include <signal.h>
#include <sys/mman.h>
#include <sys/wait.h>
#include <unistd.h>

// This C library's header forgets to say that its functions are C.
extern "C" {
#include <sys/pidfd.h>
}

#include <algorithm>
#include <array>
#include <cerrno>
#include <cstring>

namespace velt {

namespace {

using Clock = std::chrono::steady_clock;

constexpr std::size_t mostOutput = std::size_t{1} << 20;

struct Pipe {
    UniqueFd readEnd;
    UniqueFd writeEnd;
};

Pipe makePipe() {
    std::array<int, 2> ends{-1, -1};
    if (::pipe2(ends.data(), O_CLOEXEC) != 0)
        return {};
    Pipe made{UniqueFd(ends[0]), UniqueFd(ends[1])};
    ::fcntl(made.readEnd.get(), F_SETFL, O_NONBLOCK);
    return made;
}

// The input stands in a file in memory: nobody has to feed a pipe while reading two others, and a program
// that opens /dev/stdin can do so.
UniqueFd makeInput(std::string_view input) {
    UniqueFd file(::memfd_create("input", MFD_CLOEXEC));
    while (file && !input.empty()) {
        const ssize_t written = ::write(file.get(), input.data(), input.size());
        if (written < 0 && errno != EINTR)
            return UniqueFd();
        if (written > 0)
            input.remove_prefix(static_cast<std::size_t>(written));
    }
    if (file && ::lseek(file.get(), 0, SEEK_SET) != 0)
        return UniqueFd();
    return file;
}

std::string findProgram(const std::string& name) {
    if (name.find('/') != std::string::npos)
        return name;
    for (const char* folder : {"/usr/sbin/", "/usr/bin/", "/sbin/", "/bin/"})
        if (::access((folder + name).c_str(), X_OK) == 0)
            return folder + name;
    return {};
}

int spawn(pid_t& pid, const std::string& program, const std::vector<std::string>& arguments,
          const std::array<int, 3>& standard) {
    SpawnSetup setup;
    // In a process whose own standard descriptors are closed, these have their numbers. They were opened in
    // this order, so that no dup2 overwrites one that is still to come.
    for (int i = 0; i < 3; ++i)
        ::posix_spawn_file_actions_adddup2(&setup.actions, standard[static_cast<std::size_t>(i)], i);
    ::posix_spawn_file_actions_addclosefrom_np(&setup.actions, STDERR_FILENO + 1);
    std::vector<char*> argv;
    argv.reserve(arguments.size() + 1);
    for (const std::string& argument : arguments)
        argv.push_back(const_cast<char*>(argument.c_str()));
    argv.push_back(nullptr);
    char path[] = "PATH=/usr/sbin:/usr/bin:/sbin:/bin";
    char language[] = "LANG=C.UTF-8";
    char* environment[] = {path, language, nullptr};
    return ::posix_spawn(&pid, program.c_str(), &setup.actions, &setup.attributes, argv.data(), environment);
}

// Takes what stands in the pipe now. Past the limit it is read all the same, so that the writer does not
// stall.
void drain(UniqueFd& pipe, std::string& text) {
    std::array<char, 65536> block{};
    for (;;) {
        const ssize_t got = ::read(pipe.get(), block.data(), block.size());
        if (got > 0) {
            const auto room = mostOutput - text.size();
            text.append(block.data(), std::min(room, static_cast<std::size_t>(got)));
        } else if (got == 0) {
            pipe.reset();
            return;
        } else if (errno != EINTR) {
            return;
        }
    }
}

// Until the process has ended: a grandchild may hold the pipes open for longer, and nobody waits for it.
bool readUntilEnd(int process, Pipe& out, Pipe& err, Clock::time_point deadline, ProcessResult& result) {
    for (;;) {
        std::array<pollfd, 3> waiting{pollfd{process, POLLIN, 0}, pollfd{out.readEnd.get(), POLLIN, 0},
                                      pollfd{err.readEnd.get(), POLLIN, 0}};
        const auto left = std::chrono::ceil<std::chrono::milliseconds>(deadline - Clock::now()).count();
        if (left <= 0)
            return false;
        ::poll(waiting.data(), waiting.size(), static_cast<int>(std::min<long long>(left, 60'000)));
        if (out.readEnd)
            drain(out.readEnd, result.output);
        if (err.readEnd)
            drain(err.readEnd, result.errors);
        if ((waiting[0].revents & POLLIN) != 0) {
            if (out.readEnd)
                drain(out.readEnd, result.output);
            if (err.readEnd)
                drain(err.readEnd, result.errors);
            return true;
        }
    }
}

int collect(pid_t pid) {
    siginfo_t info{};
    while (::waitid(P_PID, static_cast<id_t>(pid), &info, WEXITED) != 0)
        if (errno != EINTR)
            return -1;
    return info.si_code == CLD_EXITED ? info.si_status : 128 + info.si_status;
}

ProcessResult notStarted(const std::string& name, int error) {
    ProcessResult result;
    result.errors = "Cannot start " + name + ": " + std::strerror(error) + ".";
    return result;
}

} // namespace

ProcessResult runProcess(const std::vector<std::string>& arguments, std::string_view input,
                         std::chrono::milliseconds limit) {
    if (arguments.empty())
        return notStarted("a program without a name", EINVAL);
    const auto deadline = Clock::now() + limit;
    const std::string program = findProgram(arguments[0]);
    if (program.empty())
        return notStarted(arguments[0], ENOENT);
    const UniqueFd in = makeInput(input);
    Pipe out = makePipe();
    Pipe err = makePipe();
    if (!in || !out.writeEnd || !err.writeEnd)
        return notStarted(arguments[0], errno);
    pid_t pid = -1;
    const int error = spawn(pid, program, arguments, {in.get(), out.writeEnd.get(), err.writeEnd.get()});
    if (error != 0)
        return notStarted(arguments[0], error);
    out.writeEnd.reset();
    err.writeEnd.reset();
    const UniqueFd process(::pidfd_open(pid, 0));
    ProcessResult result;
    if (process && readUntilEnd(process.get(), out, err, deadline, result)) {
        result.exitCode = collect(pid);
        return result;
    }
    ::kill(pid, SIGKILL);
    collect(pid);
    result.errors +=
        program + (process ? " ran for more than " + std::to_string(limit.count()) + " ms and was ended."
                           : std::string(" cannot be watched and was ended."));
    return result;
}

} // namespace velt
