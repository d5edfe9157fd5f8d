#include "tests/model/oracle.h"

#include "base/text.h"

#include <algorithm>

namespace velt::model {

// Whatever name it has, since what obeys it finds it by the one that counts.
bool Oracle::isObeyed(const Spot& spot) const {
    return std::ranges::any_of(tree_.namesOf(spot.place), [&](const std::string& name) {
        return model::isObeyed(account_, name, paths_.rootOf(spot));
    });
}

// Whether a rule depends on what has this name, or on nothing having it.
bool Oracle::isKept(const std::string& folder, const std::string& place) const {
    const Node* const around = tree_.at(folder);
    const Node* const node = tree_.at(place);
    return (node != nullptr && node->id != 0 && kept_.objects.contains(node->id)) ||
           (around != nullptr && kept_.absent.contains({around->id, lowerCase(nameOf(place))}));
}

bool Oracle::keepsName(const Target& target) const {
    const std::string place = join(target.folder.place, target.name);
    return isObeyed({target.folder.mount, place}) || place == account_.home ||
           isKept(target.folder.place, place);
}

const Node* Oracle::fileAt(const Target& target) const {
    const Node* node = target.reached == Reached::node ? paths_.nodeAt(target.spot) : nullptr;
    return node != nullptr && node->kind == Kind::file ? node : nullptr;
}

Expectation Oracle::withText(const Target& target, const std::string& text) const {
    Tree after = tree_;
    after.setText(target.spot.place, text);
    return allowed(std::move(after));
}

Expectation Oracle::withNew(const Target& target, Kind kind, const std::string& text) const {
    Tree after = tree_;
    after.nodes[join(target.folder.place, target.name)] = {kind, account_.uid, account_.groups[0], 0,
                                                           0,    text};
    return allowed(std::move(after));
}

Expectation Oracle::without(const Target& target) const {
    Tree after = tree_;
    after.nodes.erase(target.spot.place);
    return allowed(std::move(after));
}

Expectation Oracle::enter(const std::string& path) const {
    const Target target = paths_.find(path, true);
    if (target.reached == Reached::unclear) {
        return undecided;
    }
    const Node* node = paths_.nodeAt(target.spot);
    const bool isFolder = node == nullptr || node->kind == Kind::folder;
    const bool good = target.reached == Reached::node && isFolder && paths_.lets(target.spot, toEnter);
    return good ? allowed() : refused;
}

Expectation Oracle::list(const std::string& path) const {
    Expectation listed = enter(path);
    const Target target = paths_.find(path, true);
    if (listed.verdict != Verdict::allowed) {
        // Some servers show a file as if it were a folder that holds itself.
        const Node* node = target.reached == Reached::node ? paths_.nodeAt(target.spot) : nullptr;
        return node != nullptr && node->kind == Kind::file ? undecided : listed;
    }
    if (target.throughLink) {
        return undecided;
    }
    if (!paths_.lets(target.spot, toRead)) {
        return refused;
    }
    listed.names = paths_.namesIn(target.spot);
    return listed;
}

Expectation Oracle::read(const std::string& path) const {
    const Target target = paths_.find(path, true);
    if (target.reached == Reached::unclear) {
        return undecided;
    }
    const Node* node = fileAt(target);
    return node != nullptr && paths_.lets(target.spot, toRead)
               ? Expectation{Verdict::allowed, node->text, {}, {}, {}}
               : refused;
}

Expectation Oracle::write(const std::string& path, bool append) const {
    const Target target = paths_.find(path, true);
    if (isUnclear(target)) {
        return undecided;
    }
    if (target.reached == Reached::nothing) {
        return mayWrite(target) ? withNew(target, Kind::file, data_) : refused;
    }
    const Node* node = fileAt(target);
    return node != nullptr && mayWrite(target) ? withText(target, append ? node->text + data_ : data_)
                                               : refused;
}

Expectation Oracle::cut(const std::string& path) const {
    const Target target = paths_.find(path, true);
    if (isUnclear(target)) {
        return undecided;
    }
    return fileAt(target) != nullptr && mayWrite(target) ? withText(target, "") : refused;
}

Expectation Oracle::make(const std::string& path) const {
    const Target target = paths_.find(path, false);
    if (isUnclear(target)) {
        return undecided;
    }
    return target.reached == Reached::nothing && mayChange(target) ? withNew(target, Kind::folder, "")
                                                                   : refused;
}

Expectation Oracle::remove(const std::string& path) const {
    const Target target = paths_.find(path, false);
    if (isUnclear(target)) {
        return undecided;
    }
    const Node* node = target.reached == Reached::node ? paths_.nodeAt(target.spot) : nullptr;
    return node != nullptr && node->kind != Kind::folder && mayChange(target) ? without(target) : refused;
}

Expectation Oracle::removeFolder(const std::string& path) const {
    const Target target = paths_.find(path, false);
    if (isUnclear(target)) {
        return undecided;
    }
    const Node* node = target.reached == Reached::node ? paths_.nodeAt(target.spot) : nullptr;
    const bool good = node != nullptr && node->kind == Kind::folder && !target.isMountPoint &&
                      tree_.namesIn(target.spot.place).empty() && mayChange(target);
    return good ? without(target) : refused;
}

Expectation Oracle::withMode(const std::string& place, const std::string& mode) const {
    Tree after = tree_;
    after.setMode(place, static_cast<unsigned>(std::stoul(mode, nullptr, 8)));
    return allowed(std::move(after));
}

bool Oracle::mayOwn(const Target& target) const {
    const Node* node = target.reached == Reached::node ? paths_.nodeAt(target.spot) : nullptr;
    return node != nullptr && node->owner == account_.uid && account_.name != "ftp" &&
           paths_.accessOf(target.spot) == Access::write && !isObeyed(target.spot);
}

Expectation Oracle::changeMode(const std::string& path, const std::string& mode) const {
    const Target target = paths_.find(path, true);
    if (isUnclear(target) || target.throughLink) {
        return undecided;
    }
    return mayOwn(target) ? withMode(target.spot.place, mode) : refused;
}

Expectation Oracle::changeTimes(const std::string& path) const {
    const Target target = paths_.find(path, true);
    if (isUnclear(target) || target.throughLink) {
        return undecided;
    }
    return mayOwn(target) ? allowed() : refused;
}

} // namespace velt::model
