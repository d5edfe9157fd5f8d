#include "tests/model/oracle.h"

#include <algorithm>

namespace velt::model {
namespace {

bool isNoMove(const Target& source, const Target& target) {
    return source.reached != Reached::node || target.reached == Reached::barred || source.name.empty() ||
           target.name.empty();
}

} // namespace

Expectation Oracle::rename(const std::string& from, const std::string& to) const {
    const Target source = paths_.find(from, false);
    const Target target = paths_.find(to, false);
    if (isUnclear(source) || isUnclear(target)) {
        return undecided;
    }
    if (isNoMove(source, target)) {
        return refused;
    }
    return protocol_ == Protocol::ftp ? renameOverFtp(source, target) : renameOverSftp(source, target);
}

Expectation Oracle::renameOverFtp(const Target& source, const Target& target) const {
    return source.folder.mount != target.folder.mount ? copy(source, target) : renameWithin(source, target);
}

// Nothing is replaced, but the daemon may take what stands there for nothing, when it is a link.
Expectation Oracle::renameOverSftp(const Target& source, const Target& target) const {
    if (target.reached == Reached::node) {
        const bool isFile = paths_.nodeAt(source.spot)->kind == Kind::file;
        const Node* there = paths_.nodeAt(target.spot);
        return !isFile && there != nullptr && there->kind == Kind::link ? undecided : refused;
    }
    return source.folder.mount != target.folder.mount ? refused : renameWithin(source, target);
}

Expectation Oracle::replace(const std::string& from, const std::string& to) const {
    const Target source = paths_.find(from, false);
    const Target target = paths_.find(to, false);
    if (isUnclear(source) || isUnclear(target)) {
        return undecided;
    }
    return isNoMove(source, target) || source.folder.mount != target.folder.mount
               ? refused
               : renameWithin(source, target);
}

Expectation Oracle::renameWithin(const Target& source, const Target& target) const {
    const std::string to = join(target.folder.place, target.name);
    if (std::ranges::count(tree_.namesOf(source.spot.place), to) != 0) {
        return undecided; // a system may do nothing then
    }
    if (source.isMountPoint || target.isMountPoint || !mayChange(source) || !mayChange(target)) {
        return refused;
    }
    const Node& node = *paths_.nodeAt(source.spot);
    const Node* there = tree_.at(to);
    const bool isFolder = node.kind == Kind::folder;
    if (isWithin(to, source.spot.place) || isWithin(source.spot.place, to)) {
        return refused;
    }
    if (isFolder && source.folder.place != target.folder.place && !modesLet(account_, node, toWrite)) {
        return refused;
    }
    if (there != nullptr && (isFolder != (there->kind == Kind::folder) || !tree_.namesIn(to).empty())) {
        return refused;
    }
    Tree after = tree_;
    after.move(source.spot.place, to);
    return allowed(std::move(after));
}

// Between two mounts a server copies files, and refuses the rest.
Expectation Oracle::copy(const Target& source, const Target& target) const {
    const Node* node = paths_.nodeAt(source.spot);
    if (node == nullptr || node->kind == Kind::folder) {
        return refused;
    }
    if (node->kind == Kind::link) {
        return undecided;
    }
    if (!paths_.lets(source.spot, toRead) || !mayChange(source) || !mayWrite(target)) {
        return refused;
    }
    if (target.reached != Reached::nothing) {
        return undecided;
    }
    Expectation copied = withNew(target, Kind::file, node->text);
    copied.after->nodes.erase(source.spot.place);
    return copied;
}

// As the kernel has it for all of a Debian server (protected_hardlinks).
bool Oracle::mayGetTwin(const Node& node) const {
    return node.owner == account_.uid ||
           (node.kind == Kind::file && modesLet(account_, node, toRead | toWrite));
}

Expectation Oracle::twinOf(const Target& source, const Target& target) const {
    const Node* node = paths_.nodeAt(source.spot);
    if (node == nullptr || node->kind == Kind::folder || target.reached != Reached::nothing ||
        source.folder.mount != target.folder.mount || !mayGetTwin(*node) || keepsName(source) ||
        !mayChange(target)) {
        return refused;
    }
    Tree after = tree_;
    after.nodes[join(target.folder.place, target.name)] = *node;
    return allowed(std::move(after));
}

Expectation Oracle::twin(const std::string& from, const std::string& to) const {
    const Target source = paths_.find(from, false);
    const Target target = paths_.find(to, false);
    if (isUnclear(source) || isUnclear(target)) {
        return undecided;
    }
    return isNoMove(source, target) ? refused : twinOf(source, target);
}

Expectation Oracle::linkTo(const std::string& target, const std::string& path) const {
    const Target place = paths_.find(path, false);
    if (isUnclear(place)) {
        return undecided;
    }
    return place.reached == Reached::nothing && mayChange(place) ? withNew(place, Kind::link, target)
                                                                 : refused;
}

} // namespace velt::model
