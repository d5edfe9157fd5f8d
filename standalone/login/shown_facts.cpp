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

/// What is left of the place when the folder around it is taken away; nothing when it is not strictly within.
std::optional<std::filesystem::path> restWithin(const std::filesystem::path& folder,
                                                const std::filesystem::path& place) {
    const auto [end, rest] = std::mismatch(folder.begin(), folder.end(), place.begin(), place.end());
    if (end != folder.end() || rest == place.end()) {
        return std::nullopt;
    }
    std::filesystem::path below;
    std::for_each(rest, place.end(), [&below](const auto& part) { below /= part; });
    return below;
}

/// The path after its first part.
std::filesystem::path withoutFirst(const std::filesystem::path& path) {
    return path.lexically_relative(*path.begin());
}

/// Where a relative link leads that stays below its folder; "" for all others.
std::filesystem::path targetOf(const UniqueFd& folder, const std::string& name) {
    std::array<char, PATH_MAX> text{};
    const ssize_t size = readlinkat(folder.get(), name.c_str(), text.data(), text.size() - 1);
    const std::filesystem::path target = size > 0 ? text.data() : "";
    const bool leaves = target.is_absolute() || std::ranges::find(target, "..") != target.end();
    return leaves ? std::filesystem::path() : target;
}

} // namespace

void ShownFacts::tell(const std::string& kind, const std::string& name, const struct stat& object) {
    const std::string place = std::to_string(object.st_dev) + ' ' + std::to_string(object.st_ino);
    if (told_.insert(kind + name + '/' + place).second) {
        addFact(kind, name, place);
    }
}

Result<> ShownFacts::addWay(const UniqueFd& folder, const std::filesystem::path& below) {
    UniqueFd here(fcntl(folder.get(), F_DUPFD_CLOEXEC, 0));
    std::filesystem::path rest = below;
    for (int links = 0; here && !rest.empty() && rest != "." && links <= mostLinks;) {
        const std::string name = *rest.begin();
        rest = withoutFirst(rest);
        struct stat folderStatus {};
        struct stat status {};
        if (fstat(here.get(), &folderStatus) < 0) {
            return cannot("look at", below);
        }
        if (fstatat(here.get(), name.c_str(), &status, AT_SYMLINK_NOFOLLOW) < 0) {
            if (errno != ENOENT) {
                return cannot("look at", below);
            }
            tell("absent", name, folderStatus);
            return {};
        }
        tell("kept", "-", status);
        if (S_ISLNK(status.st_mode)) {
            links++;
            const auto target = targetOf(here, name);
            rest = target.empty() ? target : target / rest;
        } else if (!S_ISDIR(status.st_mode)) {
            return {};
        } else {
            here = UniqueFd(openat(here.get(), name.c_str(), O_PATH | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC));
        }
    }
    return here ? Result<>() : cannot("open", below);
}

Result<> ShownFacts::addRuleFolders(const std::vector<ChrootRule>& rules, const UniqueFd& folder) {
    VELT_ASSIGN_OR_RETURN(const auto place, placeOf(folder));
    std::set<std::string> seen;
    for (const ChrootRule& rule : rules) {
        const auto end = std::min(rule.path.find('/', 1), rule.path.size());
        if (rule.path == homePath || end == rule.path.size() || !seen.insert(rule.path).second) {
            continue;
        }
        const auto share = grants_.placeOfShare(rule.path.substr(1, end - 1));
        const auto below = share ? restWithin(place, *share / rule.path.substr(end + 1)) : std::nullopt;
        if (below) {
            VELT_RETURN_IF_ERROR(addWay(folder, *below));
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
