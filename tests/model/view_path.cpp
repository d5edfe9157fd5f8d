#include "tests/model/view_path.h"

#include <algorithm>

namespace velt::model {
namespace {

constexpr int mostLinks = 40;

bool isSideBySide(const Spot& spot) {
    return spot.mount < 0;
}

} // namespace

Spot ViewPaths::root() const {
    return view_.sideBySide ? Spot{} : Spot{0, tree_.placeOf(view_.mounts.at(0).folder)};
}

Access ViewPaths::accessOf(const Spot& spot) const {
    return isSideBySide(spot) ? Access::read : view_.mounts.at(static_cast<std::size_t>(spot.mount)).access;
}

std::string ViewPaths::rootOf(const Spot& spot) const {
    std::uint64_t folder = 0;
    for (int mount = spot.mount; mount >= 0;) {
        const Mount& one = view_.mounts.at(static_cast<std::size_t>(mount));
        folder = one.folder;
        mount = one.parent;
    }
    return tree_.placeOf(folder);
}

std::set<std::string> ViewPaths::namesIn(const Spot& spot) const {
    if (!isSideBySide(spot)) {
        return tree_.namesIn(spot.place);
    }
    std::set<std::string> names;
    for (const Mount& mount : view_.mounts) {
        if (mount.parent < 0) {
            names.insert(mount.name);
        }
    }
    return names;
}

bool ViewPaths::lets(const Spot& spot, unsigned bits) const {
    const Access access = accessOf(spot);
    const bool writes = (bits & toWrite) != 0;
    if (access == Access::none || (writes && access != Access::write)) {
        return false;
    }
    const Node* node = nodeAt(spot);
    return isSideBySide(spot) || (node != nullptr && modesLet(account_, *node, bits));
}

Spot ViewPaths::mountedAt(int mount, const std::string& name, std::uint64_t over) const {
    for (std::size_t i = 0; i < view_.mounts.size(); i++) {
        const Mount& one = view_.mounts[i];
        if (one.parent == mount && (mount < 0 ? one.name == name : over != 0 && one.over == over)) {
            return {static_cast<int>(i), tree_.placeOf(one.folder)};
        }
    }
    return {};
}

Target ViewPaths::step(const Spot& folder, const std::string& name) const {
    Target target{Reached::barred, {}, folder, name};
    const bool isFolder = isSideBySide(folder) || tree_.isFolder(folder.place);
    if (!isFolder || !lets(folder, toEnter)) {
        return target;
    }
    const Node* node = isSideBySide(folder) ? nullptr : tree_.at(join(folder.place, name));
    if (!isSideBySide(folder) && node == nullptr) {
        target.reached = Reached::nothing;
        return target;
    }
    const Spot mounted = mountedAt(folder.mount, name, node != nullptr ? node->id : 0);
    if (!isSideBySide(mounted)) {
        target.reached = mounted.place.empty() ? Reached::unclear : Reached::node;
        target.spot = mounted;
        target.isMountPoint = true;
        return target;
    }
    target.reached = node != nullptr ? Reached::node : Reached::nothing;
    // The kernel keeps it where it is even when it was moved to where the mount does not show.
    target.isMountPoint = node != nullptr && std::ranges::any_of(view_.mounts, [node](const Mount& mount) {
                              return mount.over != 0 && mount.over == node->id;
                          });
    target.spot = {folder.mount, node != nullptr ? join(folder.place, name) : ""};
    return target;
}

Target ViewPaths::find(const std::string& path, bool followLast) const {
    std::vector<Target> way{{Reached::node, root(), root(), "", true}};
    std::vector<std::string> rest = partsOf(path);
    bool throughLink = false;
    if (!view_.sideBySide && way[0].spot.place.empty()) {
        way[0].reached = Reached::unclear;
    }
    for (int links = 0; !rest.empty() && way.back().reached == Reached::node;) {
        const std::string name = rest.front();
        rest.erase(rest.begin());
        if (name == "..") {
            way.resize(way.size() > 1 ? way.size() - 1 : 1);
            continue;
        }
        Target next = step(way.back().spot, name);
        const Node* node = next.reached == Reached::node ? nodeAt(next.spot) : nullptr;
        if (node == nullptr || node->kind != Kind::link || (rest.empty() && !followLast)) {
            way.push_back(std::move(next));
            continue;
        }
        throughLink = throughLink || rest.empty();
        if (links++ == mostLinks) {
            return {};
        }
        const auto parts = partsOf(node->text);
        rest.insert(rest.begin(), parts.begin(), parts.end());
        way.resize(node->text.starts_with('/') ? 1 : way.size());
    }
    Target found = way.back();
    found.throughLink = throughLink;
    if (!rest.empty() && found.reached == Reached::nothing) {
        found.reached = Reached::barred;
    }
    return found;
}

} // namespace velt::model
