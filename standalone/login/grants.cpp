#include "standalone/login/grants.h"

#include "standalone/login/open_folder.h"
#include "standalone/shares/share_access.h"

#include <algorithm>
#include <map>

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

bool contains(const std::filesystem::path& outer, const std::filesystem::path& place) {
    return place == outer || isStrictlyBelow(place, outer);
}

} // namespace

Grants::Grants(const Identity& user, const std::vector<ShareEntry>& shares) : user_(user) {
    for (const ShareEntry& share : shares) {
        const Walk way = walk(share.path);
        const auto reached = placeOf(way.folder);
        const bool found = reached && way.ended;
        known_.push_back({&share, found ? *reached : reached.valueOr("/") / way.rest, found});
    }
    std::ranges::stable_sort(
        known_, {}, [](const Known& known) { return std::distance(known.place.begin(), known.place.end()); });
}

std::optional<Access> Grants::told(const ShareEntry& share) const {
    const auto access = accessOf(user_, share);
    return access ? *access : Access::none;
}

Access Grants::on(const ShareEntry& share) const {
    const auto self = std::ranges::find(known_, &share, &Known::share);
    Access access = told(share).value_or(Access::none);
    for (const Known& known : known_) {
        if (known.share != &share && contains(known.place, self->place)) {
            access = std::min(access, told(*known.share).value_or(access));
        }
    }
    return access;
}

Access Grants::leastAt(const std::filesystem::path& place, const std::filesystem::path& outer,
                       Access access) const {
    for (const Known& known : known_) {
        if (isStrictlyBelow(known.place, outer) && contains(known.place, place)) {
            access = std::min(access, told(*known.share).value_or(Access::none));
        }
    }
    return access;
}

std::vector<Restriction> Grants::restrictionsBelow(const std::filesystem::path& place, Access access) const {
    std::map<std::filesystem::path, Access> restrictions; // an outer one comes before those in it
    for (const Known& known : known_) {
        if (!known.found || !isStrictlyBelow(known.place, place)) {
            continue;
        }
        const auto folder = within(known.place, place);
        std::filesystem::path way;
        for (const auto& part : folder.parent_path()) {
            way /= part;
            restrictions.emplace(way, access);
        }
        Access& here = restrictions.emplace(folder, access).first->second;
        here = std::min(here, told(*known.share).value_or(Access::none));
    }
    std::vector<Restriction> all;
    all.reserve(restrictions.size());
    for (const auto& [folder, granted] : restrictions) {
        all.push_back({folder, granted});
    }
    return all;
}

std::vector<std::string> Grants::missingBelow(const std::filesystem::path& place) const {
    std::vector<std::string> names;
    for (const Known& known : known_) {
        if (!known.found && isStrictlyBelow(known.place, place)) {
            names.push_back(known.share->name);
        }
    }
    return names;
}

} // namespace velt
