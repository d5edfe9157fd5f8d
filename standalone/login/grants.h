// What a user may do with the shares, and with the folders around them.
#ifndef VELT_STANDALONE_LOGIN_GRANTS_H
#define VELT_STANDALONE_LOGIN_GRANTS_H

#include "base/result.h"
#include "standalone/login/view_mounts.h"
#include "standalone/shares/share_entry.h"

#include <optional>
#include <span>
#include <string>
#include <utility>
#include <vector>

namespace velt {

/// A share may lie within another one. It can then take away from what the outer one grants, but not add to
/// it. Folders are compared by their places: the paths that nobody but root can lead elsewhere. If a folder
/// is mounted in two places, only the share's own path counts.
class Grants {
public:
    /// The shares must outlive this. Asks once for each share: this is a login's view of them at one moment.
    Grants(const Identity& user, const std::vector<ShareEntry>& shares);

    /// An error when a share may be anywhere, since its path could not be followed: nothing may be shown
    /// then.
    const Result<>& looked() const { return looked_; }

    /// What the store grants or the file system allows, whichever is less; none when the store says nothing
    /// or the check fails, of which a remark tells. Shares around it for which the store says something can
    /// take from it.
    Access on(const ShareEntry& share) const;

    /// `access`, limited by the shares below the folder `outer` that contain the folder `place`.
    Access leastAt(const std::filesystem::path& place, const std::filesystem::path& outer,
                   Access access) const;

    /// What has to be mounted within `place`, which is shown with `access`, so that the shares in it keep
    /// their grants: they themselves, and the folders on the way to them, which can then be neither moved nor
    /// removed, whoever the user is.
    std::vector<Restriction> restrictionsBelow(const std::filesystem::path& place, Access access) const;

    /// The shares whose folders are missing and around which the user could otherwise write. Somebody who may
    /// write there could put another folder in the place of one, and the right one, wherever it is now, has
    /// no restrictions; so the shares around them grant at most reading.
    const std::vector<std::string>& missing() const { return missing_; }

    /// Names and places of the shares below this place, and of the innermost one at it or around it.
    std::vector<std::pair<std::string, std::filesystem::path>>
    sharesNear(const std::filesystem::path& place) const;

    /// Why `on` says what it says, in sentences: the entry of the share first, then what takes from it.
    std::vector<std::string> reasonsOn(const Identity& user, const ShareEntry& share) const;

    /// The folder of the share of this name, when it was found.
    std::optional<std::filesystem::path> placeOfShare(const std::string& name) const;

    /// A sentence for each share to which the user's access could not be checked.
    const std::vector<std::string>& remarks() const { return remarks_; }

private:
    struct Known {
        const ShareEntry* share;
        std::filesystem::path place;
        bool found;                 ///< else the place is where it should be
        std::optional<Access> told; ///< nothing when the store says nothing
        std::string key;            ///< of the place; begins with the key of each place around it
    };
    using Range = std::span<const Known>;

    /// Those whose folder is this place.
    Range at(const std::string& key) const;
    Range strictlyBelow(const std::filesystem::path& place) const;
    /// Calls `visit` for those at the place and around it, outer ones first.
    template<class Visit> void around(const std::filesystem::path& place, const Visit& visit) const;
    std::optional<Access> toldOf(const Identity& user, const ShareEntry& share);
    void limitAroundMissing();

    std::vector<Known> known_; ///< by key
    Result<> looked_;
    std::vector<std::string> missing_;
    std::vector<std::string> remarks_;
};

} // namespace velt

#endif
