// A pipe.
#ifndef VELT_BASE_PIPE_H
#define VELT_BASE_PIPE_H

#include "base/result.h"
#include "base/unique_fd.h"

namespace velt {

struct Pipe {
    UniqueFd readEnd;
    UniqueFd writeEnd;
};

/// A pipe whose ends no program inherits.
Result<Pipe> makePipe();

/// The same, but each read gives what one write gave, of up to PIPE_BUF bytes.
Result<Pipe> makePacketPipe();

} // namespace velt

#endif
