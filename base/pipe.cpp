#include "base/pipe.h"

#include <fcntl.h>

#include <cerrno>
#include <cstring>

namespace velt {
namespace {

Result<Pipe> makePipe(int flags) {
    int ends[2] = {-1, -1};
    if (::pipe2(ends, flags) != 0) {
        return Error(std::string("Cannot make a pipe: ") + std::strerror(errno) + ".");
    }
    return Pipe{UniqueFd(ends[0]), UniqueFd(ends[1])};
}

} // namespace

Result<Pipe> makePipe() {
    return makePipe(O_CLOEXEC);
}

Result<Pipe> makePacketPipe() {
    return makePipe(O_CLOEXEC | O_DIRECT);
}

} // namespace velt
