// What a user may do with the shares, and with the folders around them.
#ifndef VELT_STANDALONE_LOGIN_GRANTS_H
#define VELT_STANDALONE_LOGIN_GRANTS_H

#include "standalone/login/view_mounts.h"
#include "standalone/shares/share_entry.h"

#include <vector>

namespace velt {

/// A share may lie within another one. It can then take away from what the outer one grants, but not add to
/// it. Folders are compared by their paths without symbolic links; if a folder is mounted in two places, only
/// the share's own path counts.
class Grants {
public:
    /// Both must outlive this.
    Grants(const Identity& user, const std::vector<ShareEntry>& shares);

    /// What the store grants or the file system allows, whichever is less; none when the store says nothing
    /// or the check fails.
    Access on(const ShareEntry& share) const;

    /// `access`, limited by the shares below the folder `outer` that contain the folder `place`. Both paths
    /// are without links.
    Access leastAt(const std::filesystem::path& place, const std::filesystem::path& outer,
                   Access access) const;

    /// The shares below `place` to which the user has less than `access`.
    std::vector<Restriction> restrictionsBelow(const std::filesystem::path& place, Access access) const;

private:
    struct Known {
        const ShareEntry* share;
        std::filesystem::path place; ///< without links, as far as it exists
    };

    const Identity& user_;
    std::vector<Known> known_; ///< outer ones come first
};

} // namespace velt

#endif
