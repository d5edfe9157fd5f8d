#include "standalone/supervise/announced_start.h"

#include "base/file.h"
#include "base/pipe.h"

#include <fcntl.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <csignal>

namespace velt {
namespace {

/// Whether the other end said that it may go on, and did not just end.
bool isLetThrough(int gate) {
    char word = 0;
    ssize_t length = 0;
    do {
        length = ::read(gate, &word, 1);
    } while (length < 0 && errno == EINTR);
    return length == 1;
}

void forgetSignals() {
    for (int number = 1; number < NSIG; ++number) {
        ::signal(number, SIG_DFL);
    }
    sigset_t none;
    sigemptyset(&none);
    ::sigprocmask(SIG_SETMASK, &none, nullptr);
}

bool setStandardFiles(int output) {
    const int null = ::open("/dev/null", O_RDONLY | O_CLOEXEC);
    return null >= 0 && ::dup2(null, STDIN_FILENO) >= 0 && ::dup2(output, STDOUT_FILENO) >= 0 &&
           ::dup2(output, STDERR_FILENO) >= 0;
}

std::vector<char*> pointersTo(const std::vector<std::string>& texts) {
    std::vector<char*> pointers;
    pointers.reserve(texts.size() + 1);
    for (const std::string& text : texts) {
        pointers.push_back(const_cast<char*>(text.c_str()));
    }
    pointers.push_back(nullptr);
    return pointers;
}

/// The child: becomes the program, or tells why it cannot.
[[noreturn]] void becomeProgram(char* const* arguments, int output, int gate, int failure) {
    char path[] = "PATH=/usr/sbin:/usr/bin:/sbin:/bin";
    char language[] = "LANG=C.UTF-8";
    char* environment[] = {path, language, nullptr};
    if (!isLetThrough(gate)) {
        ::_exit(1);
    }
    if (setStandardFiles(output)) {
        forgetSignals();
        ::execve(arguments[0], arguments, environment);
    }
    const int error = errno;
    const ssize_t told = ::write(failure, &error, sizeof error);
    ::_exit(told == static_cast<ssize_t>(sizeof error) ? 1 : 2);
}

/// 0 when the pipe was closed by the start of the program.
int readFailure(int failure) {
    int error = 0;
    ssize_t length = 0;
    do {
        length = ::read(failure, &error, sizeof error);
    } while (length < 0 && errno == EINTR);
    return length == static_cast<ssize_t>(sizeof error) ? error : 0;
}

} // namespace

Result<pid_t> startAnnounced(const std::vector<std::string>& arguments, int output,
                             const std::function<Result<>()>& announce) {
    VELT_ASSIGN_OR_RETURN(auto gate, makePipe());
    VELT_ASSIGN_OR_RETURN(auto failure, makePipe());
    const std::vector<char*> pointers = pointersTo(arguments);
    const pid_t pid = ::fork();
    if (pid < 0) {
        return cannot("start", arguments[0]);
    }
    if (pid == 0) {
        gate.writeEnd.reset();
        becomeProgram(pointers.data(), output, gate.readEnd.get(), failure.writeEnd.get());
    }
    failure.writeEnd.reset();
    if (auto announced = announce(); !announced) {
        gate.writeEnd.reset(); // so it ends
        ::waitpid(pid, nullptr, 0);
        return announced.error();
    }
    constexpr char goOn = 'g';
    const bool told = ::write(gate.writeEnd.get(), &goOn, 1) == 1;
    gate.writeEnd.reset();
    const int error = told ? readFailure(failure.readEnd.get()) : EPIPE;
    if (error != 0) {
        ::waitpid(pid, nullptr, 0);
        return cannot("start", arguments[0], error);
    }
    return pid;
}

} // namespace velt
