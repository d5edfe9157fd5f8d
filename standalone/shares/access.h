// How much somebody may do with a folder, and who asks.
#ifndef VELT_STANDALONE_SHARES_ACCESS_H
#define VELT_STANDALONE_SHARES_ACCESS_H

#include <sys/types.h>

#include <string>
#include <vector>

namespace velt {

/// From the least to the most.
enum class Access {
    none,
    read,
    write, ///< reading and writing
};

/// An account as the kernel and the store of shares know it.
struct Identity {
    std::string name;
    uid_t uid = 0;
    std::vector<gid_t> gids; ///< the primary group first; never empty
};

} // namespace velt

#endif
