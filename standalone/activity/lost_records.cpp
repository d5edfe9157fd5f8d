#include "standalone/activity/activity_reader.h"

#include "base/unique_fd.h"
#include "standalone/activity/session_pages.h"
#include "standalone/activity/spool.h"
#include "standalone/core/paths.h"
#include "standalone/core/state_root.h"

#include <fcntl.h>
#include <unistd.h>

namespace velt {

namespace {

velt_lost_records read() {
    velt_lost_records lost{};
    const UniqueFd file(::open(statePath(paths::lostRecords).c_str(), O_RDONLY | O_CLOEXEC));
    return file && ::pread(file.get(), &lost, sizeof lost, 0) == sizeof lost ? lost : velt_lost_records{};
}

} // namespace

std::uint64_t lostRecords() {
    return read().count;
}

std::optional<std::chrono::system_clock::time_point> lastLostRecord() {
    const velt_lost_records lost = read();
    return lost.count > 0 ? std::optional(pageTime(lost.last)) : std::nullopt;
}

} // namespace velt
