#include "base/ask_child.h"

#include "base/pipe.h"

#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>

namespace velt {

Result<int> askChild(const std::function<int()>& question) {
    VELT_ASSIGN_OR_RETURN(auto pipe, makePipe());
    const pid_t child = ::fork();
    if (child == 0) {
        const int answer = question();
        ::_exit(::write(pipe.writeEnd.get(), &answer, sizeof answer) == sizeof answer ? 0 : 1);
    }
    if (child < 0) {
        return Error(std::string("Cannot start a process: ") + std::strerror(errno) + ".");
    }
    pipe.writeEnd.reset();
    // The answer comes by pipe: a process that ignores the end of its children gets no exit status.
    int answer = 0;
    ssize_t got = -1;
    do {
        got = ::read(pipe.readEnd.get(), &answer, sizeof answer);
    } while (got < 0 && errno == EINTR);
    while (::waitpid(child, nullptr, 0) < 0 && errno == EINTR) {
    }
    if (got != sizeof answer) {
        return Error("The child process ended without an answer.");
    }
    return answer;
}

} // namespace velt
