#include "host/base/open_file_limit.h"

#include <sys/resource.h>

#include <algorithm>

namespace velt::host {

namespace {

// Listening sockets, connections that get a 503 and those of root, files of the modules and the
// platform.
constexpr std::size_t others = 256;

} // namespace

std::size_t makeRoomForConnections(std::size_t connections) {
    rlimit files{};
    if (getrlimit(RLIMIT_NOFILE, &files) != 0) {
        return connections;
    }
    const rlim_t wanted = connections + others;
    if (files.rlim_cur < wanted) {
        files.rlim_cur = std::min<rlim_t>(wanted, files.rlim_max);
        setrlimit(RLIMIT_NOFILE, &files);
        getrlimit(RLIMIT_NOFILE, &files);
    }
    return files.rlim_cur >= wanted ? connections
                                    : std::max<std::size_t>(files.rlim_cur, others + 1) - others;
}

} // namespace velt::host
