#include "tests/model/expectation.h"

#include "base/text.h"
#include "tests/model/view_path.h"

namespace velt::model {
namespace {

const Expectation refused{};
const Expectation undecided{Verdict::undecided, {}, {}, {}};

class Oracle {
public:
    Oracle(const Tree& tree, const View& view, const Account& account, const std::string& data)
        : tree_(tree), account_(account), kept_(view.kept), paths_(tree, view, account), data_(data) {}

    Expectation enter(const std::string& path) const;
    Expectation list(const std::string& path) const;
    Expectation read(const std::string& path) const;
    Expectation write(const std::string& path, bool append) const;
    Expectation make(const std::string& path) const;
    Expectation remove(const std::string& path) const;
    Expectation removeFolder(const std::string& path) const;
    Expectation rename(const std::string& from, const std::string& to) const;
    Expectation changeMode(const std::string& path, const std::string& mode) const;

private:
    bool isObeyed(const Spot& spot) const {
        return model::isObeyed(account_, spot.place, paths_.rootOf(spot));
    }
    bool mayChange(const Target& target) const {
        const std::string place = join(target.folder.place, target.name);
        return !isObeyed({target.folder.mount, place}) && place != account_.home &&
               !isKept(target.folder.place, place) && paths_.lets(target.folder, toWrite | toEnter);
    }
    /// Whether a rule depends on what has this name, or on nothing having it.
    bool isKept(const std::string& folder, const std::string& place) const {
        const Node* const around = tree_.at(folder);
        const Node* const node = tree_.at(place);
        return (node != nullptr && node->id != 0 && kept_.objects.contains(node->id)) ||
               (around != nullptr && kept_.absent.contains({around->id, lowerCase(nameOf(place))}));
    }
    bool mayWrite(const Target& target) const {
        return target.reached == Reached::nothing
                   ? mayChange(target)
                   : paths_.lets(target.spot, toWrite) && !isObeyed(target.spot);
    }
    Expectation withNew(const Target& target, Kind kind, const std::string& text) const;
    Expectation without(const Target& target) const;
    Expectation renameWithin(const Target& source, const Target& target) const;
    Expectation copy(const Target& source, const Target& target) const;

    const Tree& tree_;
    const Account& account_;
    const KeptNames& kept_;
    ViewPaths paths_;
    const std::string& data_;
};

Expectation allowed(Tree after) {
    return {Verdict::allowed, {}, {}, std::move(after)};
}

// Where names were followed that others laid, servers differ in what becomes of the last one.
bool isUnclear(const Target& target) {
    return target.reached == Reached::unclear || (target.throughLink && target.reached != Reached::node);
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
    return good ? Expectation{Verdict::allowed, {}, {}, {}} : refused;
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
    const Node* node = target.reached == Reached::node ? paths_.nodeAt(target.spot) : nullptr;
    const bool good = node != nullptr && node->kind == Kind::file && paths_.lets(target.spot, toRead);
    return good ? Expectation{Verdict::allowed, node->text, {}, {}} : refused;
}

Expectation Oracle::write(const std::string& path, bool append) const {
    const Target target = paths_.find(path, true);
    if (isUnclear(target)) {
        return undecided;
    }
    if (target.reached == Reached::nothing) {
        return mayWrite(target) ? withNew(target, Kind::file, data_) : refused;
    }
    const Node* node = target.reached == Reached::node ? paths_.nodeAt(target.spot) : nullptr;
    if (node == nullptr || node->kind != Kind::file || !mayWrite(target)) {
        return refused;
    }
    Tree after = tree_;
    std::string& text = after.nodes[target.spot.place].text;
    text = append ? text + data_ : data_;
    return allowed(std::move(after));
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

Expectation Oracle::rename(const std::string& from, const std::string& to) const {
    const Target source = paths_.find(from, false);
    const Target target = paths_.find(to, false);
    if (isUnclear(source) || isUnclear(target)) {
        return undecided;
    }
    if (source.reached != Reached::node || target.reached == Reached::barred || source.name.empty() ||
        target.name.empty()) {
        return refused;
    }
    if (source.folder.mount != target.folder.mount) {
        return copy(source, target);
    }
    return renameWithin(source, target);
}

Expectation Oracle::renameWithin(const Target& source, const Target& target) const {
    if (source.spot.place == join(target.folder.place, target.name)) {
        return undecided;
    }
    if (source.isMountPoint || target.isMountPoint || !mayChange(source) || !mayChange(target)) {
        return refused;
    }
    const Node& node = *paths_.nodeAt(source.spot);
    const std::string to = join(target.folder.place, target.name);
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

Expectation Oracle::changeMode(const std::string& path, const std::string& mode) const {
    const Target target = paths_.find(path, true);
    if (isUnclear(target) || target.throughLink) {
        return undecided;
    }
    const Node* node = target.reached == Reached::node ? paths_.nodeAt(target.spot) : nullptr;
    if (node == nullptr || node->owner != account_.uid || account_.name == "ftp" ||
        paths_.accessOf(target.spot) != Access::write || isObeyed(target.spot)) {
        return refused;
    }
    Tree after = tree_;
    after.nodes[target.spot.place].mode = static_cast<unsigned>(std::stoul(mode, nullptr, 8));
    return allowed(std::move(after));
}

} // namespace

bool changesNames(const Step& step) {
    static const std::set<std::string> verbs{"make", "remove", "remove-folder", "rename"};
    return verbs.contains(step.at(0));
}

Expectation expect(const Tree& tree, const View& view, const Account& account, const Step& step,
                   const std::string& data) {
    const Oracle oracle(tree, view, account, data);
    const std::string& verb = step.at(0);
    const std::string& path = step.at(2);
    if (verb == "enter") {
        return oracle.enter(path);
    }
    if (verb == "read") {
        return oracle.read(path);
    }
    if (verb == "write" || verb == "append") {
        return oracle.write(path, verb == "append");
    }
    if (verb == "make") {
        return oracle.make(path);
    }
    if (verb == "remove") {
        return oracle.remove(path);
    }
    if (verb == "remove-folder") {
        return oracle.removeFolder(path);
    }
    if (verb == "rename") {
        return oracle.rename(path, step.at(3));
    }
    if (verb == "chmod") {
        return oracle.changeMode(path, step.at(3));
    }
    return oracle.list(path);
}

} // namespace velt::model
