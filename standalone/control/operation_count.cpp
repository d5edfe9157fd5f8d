#include "standalone/control/operation_count.h"

#include <map>
#include <mutex>

namespace velt {
namespace {

struct Counts {
    std::mutex mutex;
    std::map<const Daemon*, std::uint64_t> counts;
};

Counts& counts() {
    static Counts instance;
    return instance;
}

void count(const Daemon& daemon) {
    const std::lock_guard lock(counts().mutex);
    ++counts().counts[&daemon];
}

} // namespace

OperationMark::OperationMark(const Daemon& daemon) : daemon_(&daemon) {
    count(daemon);
}

OperationMark::~OperationMark() {
    if (daemon_ != nullptr) {
        count(*daemon_);
    }
}

std::uint64_t operationCount(const Daemon& daemon) {
    const std::lock_guard lock(counts().mutex);
    return counts().counts[&daemon];
}

} // namespace velt
