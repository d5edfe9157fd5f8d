#include "standalone/process/run_program.h"

#include "base/file.h"
#include "base/input_wait.h"
#include "base/pipe.h"
#include "base/spawning.h"

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

namespace velt {

namespace {

using Clock = std::chrono::steady_clock;

constexpr std::size_t mostOutput = std::size_t{1} << 20;

// The input is a file in memory: nobody has to feed a pipe while reading two others, and the program can open
// /dev/stdin.
UniqueFd makeInput(std::string_view input) {
    UniqueFd file(::memfd_create("input", MFD_CLOEXEC));
    if (file && (!writeAll(file.get(), input) || ::lseek(file.get(), 0, SEEK_SET) != 0))
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

Result<pid_t> spawn(const std::vector<std::string>& arguments, const std::array<int, 3>& standard) {
    Spawn program;
    // In a process whose own standard descriptors are closed, these have their numbers. They were opened in
    // this order, so that none is overwritten before it was passed on.
    for (int i = 0; i < 3; ++i)
        program.pass(standard[static_cast<std::size_t>(i)], i);
    program.closeFrom(STDERR_FILENO + 1);
    return program.start(arguments);
}

// Takes what is in the pipe now. Past the limit it is still read, but dropped, so that the writer does not
// stall.
void drain(UniqueFd& pipe, std::string& text) {
    std::array<char, 65536> block{};
    while (pipe && waitForInput(pipe.get(), {})) {
        const ssize_t got = ::read(pipe.get(), block.data(), block.size());
        if (got > 0) {
            const auto room = mostOutput - text.size();
            text.append(block.data(), std::min(room, static_cast<std::size_t>(got)));
        } else if (got == 0 || errno != EINTR) {
            pipe.reset();
        }
    }
}

// Until the process has ended: a grandchild may hold the pipes open for longer, and nobody waits for it.
bool readUntilEnd(int process, UniqueFd& out, UniqueFd& err, Clock::time_point deadline,
                  ProcessResult& result) {
    for (;;) {
        std::array<pollfd, 3> waiting{pollfd{process, POLLIN, 0}, pollfd{out.get(), POLLIN, 0},
                                      pollfd{err.get(), POLLIN, 0}};
        const auto left = std::chrono::ceil<std::chrono::milliseconds>(deadline - Clock::now()).count();
        if (left <= 0)
            return false;
        ::poll(waiting.data(), waiting.size(), static_cast<int>(std::min<long long>(left, 60'000)));
        const bool ended = (waiting[0].revents & POLLIN) != 0;
        drain(out, result.output);
        drain(err, result.errors);
        if (ended)
            return true;
    }
}

int collect(pid_t pid) {
    siginfo_t info{};
    while (::waitid(P_PID, static_cast<id_t>(pid), &info, WEXITED) != 0)
        if (errno != EINTR)
            return -1;
    return info.si_code == CLD_EXITED ? info.si_status : 128 + info.si_status;
}

} // namespace

Result<ProcessResult> runProcess(std::vector<std::string> arguments, std::string_view input,
                                 std::chrono::milliseconds limit) {
    if (arguments.empty())
        return cannot("start", "a program without a name", EINVAL);
    const auto deadline = Clock::now() + limit;
    const std::string program = findProgram(arguments[0]);
    if (program.empty())
        return cannot("start", arguments[0], ENOENT);
    arguments[0] = program;
    const UniqueFd in = makeInput(input);
    auto out = makePipe();
    auto err = makePipe();
    if (!in || !out || !err)
        return cannot("start", program);
    VELT_ASSIGN_OR_RETURN(const pid_t pid,
                          spawn(arguments, {in.get(), out->writeEnd.get(), err->writeEnd.get()}));
    out->writeEnd.reset();
    err->writeEnd.reset();
    const UniqueFd process(::pidfd_open(pid, 0));
    ProcessResult result;
    const bool ended = process && readUntilEnd(process.get(), out->readEnd, err->readEnd, deadline, result);
    if (!ended)
        ::kill(pid, SIGKILL);
    result.exitCode = collect(pid);
    if (!process)
        return Error(program + " cannot be watched and was ended.");
    if (!ended) {
        result.ranTooLong = true;
        result.errors += result.errors.empty() || result.errors.ends_with('\n') ? "" : "\n";
        result.errors +=
            program + " ran for more than " + std::to_string(limit.count()) + " ms and was ended.";
    }
    return result;
}

} // namespace velt
