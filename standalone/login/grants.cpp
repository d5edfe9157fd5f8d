#include "standalone/login/grants.h"

#include "standalone/shares/share_access.h"

#include <algorithm>

namespace velt {
namespace {

// "" for the folder itself; begins with ".." when `place` is outside `outer`.
std::filesystem::path within(const std::filesystem::path& place, const std::filesystem::path& outer) {
    const auto relative = place.lexically_relative(outer);
    return relative == "." ? std::filesystem::path() : relative;
}

bool isStrictlyBelow(const std::filesystem::path& place, const std::filesystem::path& outer) {
    const auto relative = within(place, outer);
    return !relative.empty() && *relative.begin() != "..";
}

} // namespace

Grants::Grants(const Identity& user, const std::vector<ShareEntry>& shares) : user_(user) {
    for (const ShareEntry& share : shares) {
        std::error_code error;
        auto place = std::filesystem::weakly_canonical(share.path, error);
        if (error) {
            place = std::filesystem::path(share.path).lexically_normal();
        }
        known_.push_back({&share, std::move(place)});
    }
    std::ranges::stable_sort(
        known_, {}, [](const Known& known) { return std::distance(known.place.begin(), known.place.end()); });
}

Access Grants::on(const ShareEntry& share) const {
    const auto access = accessOf(user_, share);
    return access ? access->value_or(Access::none) : Access::none;
}

Access Grants::leastAt(const std::filesystem::path& place, const std::filesystem::path& outer,
                       Access access) const {
    for (const Known& known : known_) {
        if (isStrictlyBelow(known.place, outer) &&
            (place == known.place || isStrictlyBelow(place, known.place))) {
            access = std::min(access, on(*known.share));
        }
    }
    return access;
}

std::vector<Restriction> Grants::restrictionsBelow(const std::filesystem::path& place, Access access) const {
    std::vector<Restriction> restrictions;
    for (const Known& known : known_) {
        std::error_code error;
        if (!isStrictlyBelow(known.place, place) || !std::filesystem::is_directory(known.place, error)) {
            continue;
        }
        if (const Access here = on(*known.share); here < access) {
            restrictions.push_back({within(known.place, place), here});
        }
    }
    return restrictions;
}

} // namespace velt
