#include "standalone/login/grants.h"

#include "standalone/login/open_folder.h"
#include "standalone/shares/share_access.h"

#include <algorithm>
#include <map>

namespace velt {
namespace {

/// Ends with '/', so that it begins with the keys of the places around it, and with no other's.
std::string keyOf(const std::filesystem::path& place) {
    std::string key = place.string();
    if (!key.ends_with('/')) {
        key += '/';
    }
    return key;
}

std::string sentenceOf(const GrantSource& source, const Identity& user, const ShareEntry& share) {
    const std::string name = "The share " + share.name;
    if (!source.access) {
        return name + " has no entry for " + user.name + " or for a group of this user.";
    }
    const std::string whom = source.group.empty() ? user.name : "the group " + source.group;
    if (*source.access == Access::none) {
        return name + " refuses " + whom +
               (source.isKnown ? "." : ", which cannot be looked up: so it refuses everybody.");
    }
    return name + " grants " + whom +
           (*source.access == Access::write ? " reading and writing." : " reading.");
}

/// What the file system allows where that is less than what is granted.
std::string sentenceOf(Access allowed, const Identity& user, const ShareEntry& share) {
    return "The file system " + std::string(allowed == Access::none ? "does not let " : "lets ") + user.name +
           (allowed == Access::none ? " list and enter " + share.path + "."
                                    : " read " + share.path + ", but not write to it.");
}

} // namespace

/// The grant, or what the file system allows where that is less.
std::optional<Access> Grants::toldOf(const Identity& user, const ShareEntry& share) {
    const auto grant = grantTo(user, share);
    if (!grant || *grant == Access::none) {
        return grant;
    }
    const auto access = accessTo(user, share.path);
    if (!access) {
        remarks_.push_back("The share " + share.name + " grants nothing now: " + access.error().message);
    }
    return std::min(*grant, access.valueOr(Access::none));
}

Grants::Grants(const Identity& user, const std::vector<ShareEntry>& shares) {
    known_.reserve(shares.size());
    for (const ShareEntry& share : shares) {
        const Walk way = walk(share.path);
        const auto reached = placeOf(way.folder);
        if (!reached || way.lost) {
            looked_ = reached ? way.ended : reached.error();
        }
        const bool found = reached && way.ended;
        const auto place = found ? *reached : reached.valueOr("/") / way.rest;
        known_.push_back({&share, place, found, toldOf(user, share), keyOf(place)});
    }
    std::ranges::stable_sort(known_, {}, &Known::key);
    limitAroundMissing();
}

void Grants::limitAroundMissing() {
    std::vector<Known*> limited;
    for (Known& outer : known_) {
        const Range below = strictlyBelow(outer.place);
        if (outer.told == Access::write && !std::ranges::all_of(below, &Known::found)) {
            limited.push_back(&outer);
        }
    }
    for (const Known& known : known_) {
        const auto isAround = [&known](const Known* outer) {
            return outer->key != known.key && known.key.starts_with(outer->key);
        };
        if (!known.found && std::ranges::any_of(limited, isAround)) {
            missing_.push_back(known.share->name);
        }
    }
    for (Known* const outer : limited) {
        outer->told = Access::read;
    }
}

Grants::Range Grants::at(const std::string& key) const {
    return {std::ranges::lower_bound(known_, key, {}, &Known::key),
            std::ranges::upper_bound(known_, key, {}, &Known::key)};
}

Grants::Range Grants::strictlyBelow(const std::filesystem::path& place) const {
    const std::string outer = keyOf(place);
    const auto first = std::ranges::upper_bound(known_, outer, {}, &Known::key);
    const auto last = std::find_if(first, known_.end(),
                                   [&outer](const Known& known) { return !known.key.starts_with(outer); });
    return {first, last};
}

template<class Visit> void Grants::around(const std::filesystem::path& place, const Visit& visit) const {
    const std::string key = keyOf(place);
    for (auto end = key.find('/'); end != std::string::npos; end = key.find('/', end + 1)) {
        std::ranges::for_each(at(key.substr(0, end + 1)), visit);
    }
}

Access Grants::on(const ShareEntry& share) const {
    const auto self = std::ranges::find(known_, &share, &Known::share);
    Access access = self->told.value_or(Access::none);
    around(self->place,
           [&access](const Known& known) { access = std::min(access, known.told.value_or(access)); });
    return access;
}

std::vector<std::pair<std::string, std::filesystem::path>>
Grants::sharesNear(const std::filesystem::path& place) const {
    std::vector<std::pair<std::string, std::filesystem::path>> near;
    const Known* innermost = nullptr;
    around(place, [&innermost](const Known& known) { innermost = &known; });
    if (innermost != nullptr) {
        near.emplace_back(innermost->share->name, innermost->place);
    }
    for (const Known& known : strictlyBelow(place)) {
        near.emplace_back(known.share->name, known.place);
    }
    return near;
}

std::optional<std::filesystem::path> Grants::placeOfShare(const std::string& name) const {
    const auto found =
        std::ranges::find_if(known_, [&name](const Known& known) { return known.share->name == name; });
    return found != known_.end() && found->found ? std::optional(found->place) : std::nullopt;
}

std::vector<std::string> Grants::reasonsOn(const Identity& user, const ShareEntry& share) const {
    const auto self = std::ranges::find(known_, &share, &Known::share);
    const GrantSource source = grantSource(user, share);
    std::vector<std::string> reasons{sentenceOf(source, user, share)};
    const Access granted = source.access.value_or(Access::none);
    if (granted == Access::none) {
        return reasons;
    }
    const auto allowed = accessTo(user, share.path);
    if (!allowed || *allowed < granted) {
        reasons.push_back(allowed ? sentenceOf(*allowed, user, share) : allowed.error().message);
    }
    const Access least = std::min(granted, allowed.valueOr(Access::none));
    if (self->told < least) {
        reasons.emplace_back("A share within it is missing; until it is back, nobody writes here.");
    }
    around(self->place, [&](const Known& known) {
        if (known.share != &share && known.told && *known.told < least) {
            reasons.push_back("The share " + known.share->name + " around it lets the user " +
                              (*known.told == Access::none ? "do nothing." : "only read."));
        }
    });
    return reasons;
}

Access Grants::leastAt(const std::filesystem::path& place, const std::filesystem::path& outer,
                       Access access) const {
    const std::string limit = keyOf(outer);
    around(place, [&](const Known& known) {
        if (known.key != limit && known.key.starts_with(limit)) {
            access = std::min(access, known.told.value_or(Access::none));
        }
    });
    return access;
}

std::vector<Restriction> Grants::restrictionsBelow(const std::filesystem::path& place, Access access) const {
    std::map<std::filesystem::path, Access> restrictions; // an outer one comes before those in it
    for (const Known& known : strictlyBelow(place)) {
        if (!known.found) {
            continue;
        }
        const auto folder = known.place.lexically_relative(place);
        std::filesystem::path way;
        for (const auto& part : folder.parent_path()) {
            way /= part;
            restrictions.emplace(way, access);
        }
        Access& here = restrictions.emplace(folder, access).first->second;
        here = std::min(here, known.told.value_or(Access::none));
    }
    std::vector<Restriction> all;
    all.reserve(restrictions.size());
    for (const auto& [folder, granted] : restrictions) {
        all.push_back({folder, granted});
    }
    return all;
}

} // namespace velt
