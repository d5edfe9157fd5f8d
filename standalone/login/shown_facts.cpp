#include "standalone/login/shown_facts.h"

#include "base/file.h"
#include "standalone/login/open_folder.h"

#include <fcntl.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <climits>

namespace velt {
namespace {

constexpr int mostLinks = 40;
constexpr int asFolder = O_PATH | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC;

/// What is left of the place when the folder around it, or at it, is taken away; nothing when it is not
/// within.
std::optional<std::filesystem::path> restWithin(const std::filesystem::path& folder,
                                                const std::filesystem::path& place) {
    const auto [end, rest] = std::mismatch(folder.begin(), folder.end(), place.begin(), place.end());
    if (end != folder.end()) {
        return std::nullopt;
    }
    std::filesystem::path below;
    std::for_each(rest, place.end(), [&below](const auto& part) { below /= part; });
    return below;
}

/// The path after its first part.
std::filesystem::path withoutFirst(const std::filesystem::path& path) {
    std::filesystem::path rest;
    std::for_each(std::next(path.begin()), path.end(), [&rest](const auto& part) { rest /= part; });
    return rest;
}

/// What a relative link says; "" for all others, which no rule follows.
std::filesystem::path targetOf(const UniqueFd& folder, const std::string& name) {
    std::array<char, PATH_MAX> text{};
    const ssize_t size = readlinkat(folder.get(), name.c_str(), text.data(), text.size() - 1);
    const std::filesystem::path target = size > 0 ? text.data() : "";
    return target.is_absolute() ? std::filesystem::path() : target;
}

std::string identityOf(const struct stat& object) {
    return std::to_string(object.st_dev) + ' ' + std::to_string(object.st_ino);
}

} // namespace

void ShownFacts::tell(const std::string& kind, const std::string& name, const std::string& place) {
    if (told_.insert(kind + name + '/' + place).second) {
        addFact(kind, name, place);
    }
}

Result<bool> ShownFacts::addStep(const UniqueFd& folder, const std::string& name, mode_t& type) {
    struct stat around {};
    struct stat status {};
    if (fstat(folder.get(), &around) < 0) {
        return cannot("look at", name);
    }
    if (fstatat(folder.get(), name.c_str(), &status, AT_SYMLINK_NOFOLLOW) < 0) {
        if (errno != ENOENT) {
            return cannot("look at", name);
        }
        tell("absent", name, identityOf(around));
        return true;
    }
    tell("kept", name, identityOf(around) + ' ' + identityOf(status));
    type = status.st_mode & S_IFMT;
    return type != S_IFLNK && type != S_IFDIR;
}

Result<> ShownFacts::addWay(const UniqueFd& folder, const std::filesystem::path& below) {
    std::vector<UniqueFd> way; // up to which ".." leads back; no rule leads out of the folder
    way.emplace_back(fcntl(folder.get(), F_DUPFD_CLOEXEC, 0));
    std::filesystem::path rest = below;
    for (int links = 0; way.back() && !rest.empty() && links <= mostLinks;) {
        const std::string name = *rest.begin();
        rest = withoutFirst(rest);
        if (name.empty() || name == ".") {
            continue;
        }
        if (name == "..") {
            way.pop_back();
            if (way.empty()) {
                return {};
            }
            continue;
        }
        mode_t type = 0;
        VELT_ASSIGN_OR_RETURN(const bool ended, addStep(way.back(), name, type));
        if (ended) {
            return {};
        }
        if (type == S_IFLNK) {
            links++;
            const auto target = targetOf(way.back(), name);
            rest = target.empty() ? target : target / rest;
        } else {
            way.emplace_back(openat(way.back().get(), name.c_str(), asFolder));
        }
    }
    return way.back() ? Result<>() : cannot("open", below);
}

Result<> ShownFacts::addWayInShare(const UniqueFd& folder, const std::filesystem::path& place,
                                   const std::filesystem::path& share, const std::filesystem::path& below) {
    if (const auto within = restWithin(place, share)) {
        return addWay(folder, *within / below);
    }
    if (!restWithin(share, place)) {
        return {};
    }
    VELT_ASSIGN_OR_RETURN(const auto outer, openFolder(share));
    VELT_ASSIGN_OR_RETURN(const auto reached, placeOf(outer));
    if (reached != share) {
        return cannot("open", share, ELOOP);
    }
    return addWay(outer, below);
}

Result<> ShownFacts::addRuleFolders(const std::vector<ChrootRule>& rules, const UniqueFd& folder) {
    VELT_ASSIGN_OR_RETURN(const auto place, placeOf(folder));
    std::set<std::string> seen;
    for (const ChrootRule& rule : rules) {
        const auto end = std::min(rule.path.find('/', 1), rule.path.size());
        if (rule.path == homePath || end == rule.path.size() || !seen.insert(rule.path).second) {
            continue;
        }
        if (const auto share = grants_.placeOfShare(rule.path.substr(1, end - 1))) {
            VELT_RETURN_IF_ERROR(addWayInShare(folder, place, *share, rule.path.substr(end + 1)));
        }
    }
    return {};
}

void ShownFacts::addFact(const std::string& kind, const std::string& name,
                         const std::filesystem::path& place) {
    text_ += kind + '\0' + name + '\0' + place.string() + '\0';
}

void ShownFacts::add(const std::string& path, const UniqueFd& folder) {
    const auto place = placeOf(folder);
    if (!place) {
        return;
    }
    addFact("view", path, *place);
    for (const auto& [share, where] : grants_.sharesNear(*place)) {
        addFact("share", share, where);
    }
}

} // namespace velt
