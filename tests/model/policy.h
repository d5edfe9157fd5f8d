// The model of access: what the documented rules give each login. Written from docs/confinement.md, not from
// the code that it judges.
#ifndef VELT_TESTS_MODEL_POLICY_H
#define VELT_TESTS_MODEL_POLICY_H

#include "tests/model/tree.h"

#include <utility>

namespace velt::model {

enum class Access {
    none,
    read,
    write,
};

struct Share {
    std::string name;
    std::string path;
    bool offered = true;
    std::map<std::string, Access> users;
    std::map<std::string, Access> groups;
};

struct Rule {
    std::string who; ///< "alice" or "@staff"
    std::string path;
};

struct Switches {
    bool confined = false;   ///< users without a rule see their homes, else the shares
    bool anonymous = false;  ///< anonymous users are let in
    std::string guestsShare; ///< what they see; "": the shares
};

/// All that decides what a login may do.
struct World {
    Tree tree;
    std::vector<Share> shares;
    std::vector<Rule> rules;
    Switches switches;
    long changes = 0; ///< how often the shares or rules were written
};

/// "ftp" is the account of anonymous users.
const std::vector<Account>& accounts();
const Account& accountOf(const std::string& name);
/// Nothing when there is no such group.
std::optional<unsigned> groupNumber(const std::string& name);

/// A mounted folder of a view.
struct Mount {
    int parent = -1;        ///< the mount in which it lies; -1: the view's root
    std::uint64_t over = 0; ///< the folder there that it covers; 0 in the root
    std::string name;       ///< in a root that shows several shares side by side; else ""
    std::uint64_t folder = 0;
    Access access = Access::none; ///< none: it looks empty and cannot be entered
};

/// What a share, or the home, gave the user when he logged in.
struct Limit {
    std::uint64_t folder = 0;
    std::string place; ///< where it was
    Access access = Access::none;
};

/// What chroot rules depend on within the folders of a view that may be written: folders and links on the way
/// of a rule, and names at which nothing stands.
struct KeptNames {
    std::set<std::uint64_t> objects;
    std::set<std::pair<std::uint64_t, std::string>> absent; ///< of a folder; the name in small letters
};

struct View {
    bool sideBySide = false;
    KeptNames kept;
    std::vector<Mount> mounts; ///< the root first, unless several folders stand side by side
    std::vector<Limit> limits; ///< whatever the mounts are: see mayReach
};

/// Nothing when the login is refused.
std::optional<View> viewOf(const World& world, const Account& account);

/// Whether log-ins and shells obey what is at the place, in this user's home: the service changes nothing
/// there. `root` is the folder that is shown; if it lies deeper than what is obeyed, the administrator opened
/// just that.
bool isObeyed(const Account& account, const std::string& place, const std::string& root);

/// Whether such a view may ever lead to this place with this access, whatever was done since: the innermost
/// share or home around it must have given that much. One that was moved since goes on giving, and takes
/// nothing from what is around it now. Says less than the mounts do, and depends on less.
bool mayReach(const Tree& tree, const View& view, const std::string& place, Access access);

} // namespace velt::model

#endif
