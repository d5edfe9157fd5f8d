#include "tests/model/tree.h"

#include <algorithm>

namespace velt::model {
namespace {

constexpr int mostLinks = 40;

// The parts of the text of a link, before what was left of the path.
void putBefore(std::vector<std::string>& rest, const std::string& text) {
    const auto parts = partsOf(text);
    rest.insert(rest.begin(), parts.begin(), parts.end());
}

std::string joinAll(std::string place, const std::vector<std::string>& rest) {
    for (const std::string& part : rest) {
        place = part == ".." ? parentOf(place) : join(place, part);
    }
    return place;
}

bool onlyRootChanges(const Node& folder) {
    return folder.owner == 0 && (folder.mode & 022U) == 0;
}

} // namespace

std::string parentOf(const std::string& path) {
    const auto slash = path.rfind('/');
    return slash == 0 || slash == std::string::npos ? "/" : path.substr(0, slash);
}

std::string nameOf(const std::string& path) {
    return path.substr(path.rfind('/') + 1);
}

std::string join(const std::string& folder, const std::string& name) {
    return folder == "/" ? "/" + name : folder + "/" + name;
}

bool isWithin(const std::string& place, const std::string& outer) {
    return outer == "/" || place == outer || place.starts_with(outer + "/");
}

std::vector<std::string> partsOf(const std::string& path) {
    std::vector<std::string> parts;
    for (std::size_t start = 0; start < path.size();) {
        const auto end = std::min(path.find('/', start), path.size());
        if (end > start && path.substr(start, end - start) != ".") {
            parts.push_back(path.substr(start, end - start));
        }
        start = end + 1;
    }
    return parts;
}

const Node* Tree::at(const std::string& path) const {
    const auto found = nodes.find(path);
    return found == nodes.end() ? nullptr : &found->second;
}

bool Tree::isFolder(const std::string& path) const {
    const Node* node = at(path);
    return node != nullptr && node->kind == Kind::folder;
}

std::string Tree::placeOf(std::uint64_t id) const {
    for (const auto& [path, node] : nodes) {
        if (node.id == id) {
            return path;
        }
    }
    return "";
}

std::vector<std::string> Tree::namesOf(const std::string& file) const {
    std::vector<std::string> names{file};
    const Node* const node = at(file);
    for (const auto& [path, other] : nodes) {
        if (node != nullptr && node->id != 0 && node->kind != Kind::folder && other.id == node->id &&
            path != file) {
            names.push_back(path);
        }
    }
    return names;
}

void Tree::setText(const std::string& file, const std::string& text) {
    for (const std::string& name : namesOf(file)) {
        nodes.at(name).text = text;
    }
}

void Tree::setMode(const std::string& path, unsigned mode) {
    for (const std::string& name : namesOf(path)) {
        nodes.at(name).mode = mode;
    }
}

std::set<std::string> Tree::namesIn(const std::string& folder) const {
    std::set<std::string> names;
    for (const auto& [path, node] : nodes) {
        if (path != "/" && parentOf(path) == folder) {
            names.insert(nameOf(path));
        }
    }
    return names;
}

void Tree::move(const std::string& from, const std::string& to) {
    if (from == to) {
        return;
    }
    nodes.erase(to);
    std::map<std::string, Node> moved;
    for (auto entry = nodes.begin(); entry != nodes.end();) {
        if (isWithin(entry->first, from)) {
            moved.emplace(to + entry->first.substr(from.size()), std::move(entry->second));
            entry = nodes.erase(entry);
        } else {
            ++entry;
        }
    }
    nodes.merge(moved);
}

bool modesLet(const Account& account, const Node& node, unsigned bits) {
    const bool inGroup = std::ranges::find(account.groups, node.group) != account.groups.end();
    const unsigned shift = account.uid == node.owner ? 6 : inGroup ? 3 : 0;
    return ((node.mode >> shift) & bits) == bits;
}

Place walk(const Tree& tree, const std::string& path, const Account* account) {
    std::string place = "/";
    std::vector<std::string> rest = partsOf(path);
    for (int links = 0; !rest.empty();) {
        const Node& folder = *tree.at(place);
        const std::string next = rest.front() == ".." ? parentOf(place) : join(place, rest.front());
        const Node* node = tree.at(next);
        const bool entered = account == nullptr || modesLet(*account, folder, toEnter);
        if (node == nullptr || !entered || node->kind == Kind::file) {
            return {joinAll(place, rest), false};
        }
        if (node->kind == Kind::link) {
            if (!onlyRootChanges(folder) || links++ == mostLinks) {
                return {joinAll(place, rest), false};
            }
            rest.erase(rest.begin());
            putBefore(rest, node->text);
            place = node->text.starts_with('/') ? "/" : place;
            continue;
        }
        rest.erase(rest.begin());
        place = next;
    }
    return {place, true};
}

std::optional<std::string> walkBelow(const Tree& tree, const std::string& folder, const std::string& below,
                                     const Account& account) {
    std::string place = folder;
    std::vector<std::string> rest = partsOf(below);
    for (int links = 0; !rest.empty();) {
        const std::string next = rest.front() == ".." ? parentOf(place) : join(place, rest.front());
        const Node* node = tree.at(next);
        const bool leadsOut = rest.front() == ".." && place == folder;
        if (leadsOut || node == nullptr || !modesLet(account, *tree.at(place), toEnter) ||
            node->kind == Kind::file) {
            return std::nullopt;
        }
        rest.erase(rest.begin());
        if (node->kind == Kind::link) {
            if (node->text.starts_with('/') || links++ == mostLinks) {
                return std::nullopt;
            }
            putBefore(rest, node->text);
            continue;
        }
        place = next;
    }
    return place;
}

} // namespace velt::model
