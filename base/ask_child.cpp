#include "base/ask_child.h"

#include "base/unique_fd.h"

#include <fcntl.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>

namespace velt {

Result<int> askChild(const std::function<int()>& question) {
    int ends[2];
    if (::pipe2(ends, O_CLOEXEC) != 0) {
        return Error(std::string("Cannot make a pipe: ") + std::strerror(errno) + ".");
    }
    const UniqueFd from(ends[0]);
    UniqueFd to(ends[1]);
    const pid_t child = ::fork();
    if (child == 0) {
        const int answer = question();
        ::_exit(::write(to.get(), &answer, sizeof answer) == sizeof answer ? 0 : 1);
    }
    if (child < 0) {
        return Error(std::string("Cannot start a process: ") + std::strerror(errno) + ".");
    }
    to.reset();
    // The answer comes by pipe: a process that ignores the end of its children gets no exit status.
    int answer = 0;
    ssize_t got = -1;
    do {
        got = ::read(from.get(), &answer, sizeof answer);
    } while (got < 0 && errno == EINTR);
    while (::waitpid(child, nullptr, 0) < 0 && errno == EINTR) {
    }
    if (got != sizeof answer) {
        return Error("The process that was asked ended without an answer.");
    }
    return answer;
}

} // namespace velt
