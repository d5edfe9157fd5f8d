#include "standalone/login/grants.h"

#include "standalone/shares/share_privilege.h"

#include <algorithm>

namespace velt {
namespace {

// "" for a folder itself, ".." and more for one outside.
std::filesystem::path within(const std::filesystem::path& place, const std::filesystem::path& outer) {
    const auto relative = place.lexically_relative(outer);
    return relative == "." ? std::filesystem::path() : relative;
}

bool isStrictlyBelow(const std::filesystem::path& place, const std::filesystem::path& outer) {
    const auto relative = within(place, outer);
    return !relative.empty() && *relative.begin() != "..";
}

} // namespace

Grants::Grants(const Login& login, const std::vector<ShareEntry>& shares) : login_(login) {
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
    switch (privilegeOfUser(share, login_.user, login_.uid, login_.gids).value_or(SharePrivilege::none)) {
    case SharePrivilege::readWrite:
        return Access::write;
    case SharePrivilege::readOnly:
        return Access::read;
    case SharePrivilege::none:
    case SharePrivilege::denied:
        break;
    }
    return Access::none;
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
            restrictions.push_back({within(known.place, place), here == Access::none});
        }
    }
    return restrictions;
}

} // namespace velt
