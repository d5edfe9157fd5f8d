// Which operations on daemons this process has begun and ended, so that what others do can be told apart.
#ifndef VELT_STANDALONE_CONTROL_OPERATION_COUNT_H
#define VELT_STANDALONE_CONTROL_OPERATION_COUNT_H

#include "standalone/daemons/daemon.h"

#include <cstdint>
#include <utility>

namespace velt {

/// One operation on a daemon, while it lives.
class OperationMark {
public:
    explicit OperationMark(const Daemon& daemon);
    ~OperationMark();
    OperationMark(OperationMark&& other) noexcept : daemon_(std::exchange(other.daemon_, nullptr)) {}
    OperationMark& operator=(OperationMark&&) = delete;

private:
    const Daemon* daemon_; ///< null once moved from
};

/// How many operations of this process on the daemon have begun or ended so far. Equal at two moments, and
/// even: there was none between them.
std::uint64_t operationCount(const Daemon& daemon);

} // namespace velt

#endif
