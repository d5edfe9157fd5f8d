// What a login may do with the shares, and so with the folders in which they lie.
#ifndef VELT_STANDALONE_LOGIN_GRANTS_H
#define VELT_STANDALONE_LOGIN_GRANTS_H

#include "standalone/login/view_mounts.h"
#include "standalone/shares/share.h"

#include <vector>

namespace velt {

/// Shares may lie within each other: the inner one then counts for its part of the outer one as well, and can
/// take from what the outer one grants, but not add to it. Folders are told by their paths without symbolic
/// links; a folder that is mounted at a second place as well is known at the place of its share only.
class Grants {
public:
    /// Both must outlive this.
    Grants(const Identity& user, const std::vector<ShareEntry>& shares);

    /// What the store grants and the file system allows, whichever is less; none also where the store says
    /// nothing, or where the file system cannot be asked.
    Access on(const ShareEntry& share) const;

    /// The least of `access` and of what the login may do with the shares below `outer` (a folder) in which
    /// the folder `place` lies. Both paths are free of links.
    Access leastAt(const std::filesystem::path& place, const std::filesystem::path& outer,
                   Access access) const;

    /// The shares strictly below `place` that the login may use less than by `access`.
    std::vector<Restriction> restrictionsBelow(const std::filesystem::path& place, Access access) const;

private:
    struct Known {
        const ShareEntry* share;
        std::filesystem::path place; ///< free of links as far as it exists
    };

    const Identity& user_;
    std::vector<Known> known_; ///< outer ones come first
};

} // namespace velt

#endif
