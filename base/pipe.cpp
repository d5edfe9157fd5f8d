#include "base/pipe.h"

#include <fcntl.h>

#include <cerrno>
#include <cstring>

namespace velt {

Result<Pipe> makePipe() {
    int ends[2] = {-1, -1};
    if (::pipe2(ends, O_CLOEXEC) != 0) {
        return Error(std::string("Cannot make a pipe: ") + std::strerror(errno) + ".");
    }
    return Pipe{UniqueFd(ends[0]), UniqueFd(ends[1])};
}

} // namespace velt
