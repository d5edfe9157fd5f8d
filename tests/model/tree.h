// The model of access: folders, files and links, and what the file system allows. Nothing here asks a system.
#ifndef VELT_TESTS_MODEL_TREE_H
#define VELT_TESTS_MODEL_TREE_H

#include <cstdint>
#include <map>
#include <optional>
#include <set>
#include <string>
#include <vector>

namespace velt::model {

// Paths are absolute and without "." and ".."; "/" is the first folder.

std::string parentOf(const std::string& path);
std::string nameOf(const std::string& path);
std::string join(const std::string& folder, const std::string& name);
/// Whether `place` lies in the folder `outer`, or is it.
bool isWithin(const std::string& place, const std::string& outer);
inline bool isStrictlyWithin(const std::string& place, const std::string& outer) {
    return place != outer && isWithin(place, outer);
}
std::vector<std::string> partsOf(const std::string& path);

struct Account {
    std::string name;
    unsigned uid = 0;
    std::vector<unsigned> groups; ///< the primary one first
    std::string home;
};

enum class Kind {
    folder,
    file,
    link,
};

struct Node {
    Kind kind = Kind::folder;
    unsigned owner = 0;
    unsigned group = 0;
    unsigned mode = 0;    ///< the nine permission bits
    std::uint64_t id = 0; ///< the same as long as it exists, wherever it is moved; 0: just made
    std::string text;     ///< what a file holds, where a link leads
};

/// Everything that exists, by its path. The folders on the way to a node exist.
struct Tree {
    std::map<std::string, Node> nodes;

    const Node* at(const std::string& path) const;
    bool isFolder(const std::string& path) const;
    /// Where the node is now; "" when it is gone.
    std::string placeOf(std::uint64_t id) const;
    /// All names of the file at this place, its own first.
    std::vector<std::string> namesOf(const std::string& file) const;
    /// Whatever name it has.
    void setText(const std::string& file, const std::string& text);
    void setMode(const std::string& path, unsigned mode);
    std::set<std::string> namesIn(const std::string& folder) const;
    void move(const std::string& from, const std::string& to);
};

// What the modes let somebody do; the bits may be combined.
inline constexpr unsigned toRead = 4;
inline constexpr unsigned toWrite = 2;
inline constexpr unsigned toEnter = 1;
bool modesLet(const Account& account, const Node& node, unsigned bits);

/// Where a path leads that the administrator wrote.
struct Place {
    std::string path;   ///< without links; where it should be when it was not found
    bool found = false; ///< it leads to a folder
};

/// Follows only links in folders of root's that nobody else may change: anybody else could have laid them.
/// With an account, only through folders that the account may enter.
Place walk(const Tree& tree, const std::string& path, const Account* account = nullptr);

/// Where the path below the folder leads this account; nothing when it leads to no folder, or out of it.
std::optional<std::string> walkBelow(const Tree& tree, const std::string& folder, const std::string& below,
                                     const Account& account);

} // namespace velt::model

#endif
