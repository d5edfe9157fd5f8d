#include "tests/model/policy.h"

#include "base/text.h"

#include <algorithm>
#include <stdexcept>

namespace velt::model {
namespace {

class Policy {
public:
    Policy(const World& world, const Account& account) : world_(world), account_(account) {
        for (const Share& share : world.shares) {
            places_.push_back(walk(world.tree, share.path));
        }
    }

    std::optional<View> view() const;

private:
    /// Nothing when the share says nothing about the account. While a share within it is missing, nobody
    /// writes to it.
    std::optional<Access> told(const Share& share) const;
    std::optional<Access> toldToGroups(const Share& share) const;
    Access fileSystemAllows(const std::string& path) const;
    /// The access by the share's own name: the least of all shares at and above it that say something.
    Access on(std::size_t share) const;
    /// The access limited by the shares at and above the place that lie strictly within `outer`.
    Access leastWithin(const std::string& place, const std::string& outer, Access access) const;
    bool missesOneWithin(const std::string& place) const;
    bool mayEnter(const std::string& place) const {
        return modesLet(account_, *world_.tree.at(place), toEnter);
    }
    std::optional<std::string> ruledPath() const;

    std::optional<View> home() const;
    std::optional<View> inShare(const std::string& path) const;
    View allShares() const;
    std::optional<View> guests() const;

    void mount(View& view, Mount shown, const std::string& place) const;
    void keepRuleFolders(KeptNames& kept, const std::string& shown) const;
    void keepWay(KeptNames& kept, std::string here, std::vector<std::string> rest) const;
    void addLimits(View& view) const;

    const World& world_;
    const Account& account_;
    std::vector<Place> places_; ///< of the shares, in their order
};

std::optional<Access> Policy::told(const Share& share) const {
    const auto own = share.users.find(account_.name);
    const auto granted = own != share.users.end() ? std::optional(own->second) : toldToGroups(share);
    if (!granted) {
        return granted;
    }
    const Access most = missesOneWithin(walk(world_.tree, share.path).path) ? Access::read : Access::write;
    return std::min({*granted, fileSystemAllows(share.path), most});
}

std::optional<Access> Policy::toldToGroups(const Share& share) const {
    std::optional<Access> best;
    for (const auto& [name, access] : share.groups) {
        const auto number = groupNumber(name);
        const bool member = number && std::ranges::find(account_.groups, *number) != account_.groups.end();
        if (access == Access::none && (member || !number)) {
            return access;
        }
        best = member ? std::max(best, std::optional(access)) : best;
    }
    return best;
}

Access Policy::fileSystemAllows(const std::string& path) const {
    const Place place = walk(world_.tree, path, &account_);
    const Node* folder = world_.tree.at(place.path);
    if (!place.found || !modesLet(account_, *folder, toRead | toEnter)) {
        return Access::none;
    }
    return modesLet(account_, *folder, toWrite) ? Access::write : Access::read;
}

Access Policy::on(std::size_t share) const {
    Access access = told(world_.shares[share]).value_or(Access::none);
    for (std::size_t i = 0; i < places_.size(); i++) {
        if (isWithin(places_[share].path, places_[i].path)) {
            access = std::min(access, told(world_.shares[i]).value_or(access));
        }
    }
    return access;
}

Access Policy::leastWithin(const std::string& place, const std::string& outer, Access access) const {
    for (std::size_t i = 0; i < places_.size(); i++) {
        if (isStrictlyWithin(places_[i].path, outer) && isWithin(place, places_[i].path)) {
            access = std::min(access, told(world_.shares[i]).value_or(Access::none));
        }
    }
    return access;
}

bool Policy::missesOneWithin(const std::string& place) const {
    return std::ranges::any_of(
        places_, [&](const Place& one) { return !one.found && isStrictlyWithin(one.path, place); });
}

// A user's own rule comes before those of groups.
std::optional<std::string> Policy::ruledPath() const {
    for (const bool ofGroups : {false, true}) {
        for (const Rule& rule : world_.rules) {
            const bool isGroup = rule.who.starts_with('@');
            const bool meant = isGroup
                                   ? std::ranges::find(account_.groups, groupNumber(rule.who.substr(1))) !=
                                         account_.groups.end()
                                   : rule.who == account_.name;
            if (isGroup == ofGroups && meant) {
                return rule.path;
            }
        }
    }
    return std::nullopt;
}

std::optional<View> Policy::view() const {
    if (account_.name == "ftp") {
        return world_.switches.anonymous ? guests() : std::nullopt;
    }
    const auto rule = ruledPath();
    if (rule && *rule != "/home") {
        return inShare(*rule);
    }
    return rule || world_.switches.confined ? home() : allShares();
}

std::optional<View> Policy::home() const {
    const Place place = walk(world_.tree, account_.home, &account_);
    if (!place.found || place.path == "/") {
        return std::nullopt;
    }
    const Access access = leastWithin(place.path, parentOf(place.path), Access::write);
    if (access == Access::none || !mayEnter(place.path)) {
        return std::nullopt;
    }
    View view;
    mount(view, {-1, 0, "", world_.tree.at(place.path)->id, access}, place.path);
    view.limits.push_back({world_.tree.at(place.path)->id, place.path, access});
    for (const Place& inner : places_) {
        if (inner.found && isStrictlyWithin(inner.path, place.path)) {
            const Access least = leastWithin(inner.path, place.path, access);
            view.limits.push_back({world_.tree.at(inner.path)->id, inner.path, least});
        }
    }
    return view;
}

std::optional<View> Policy::inShare(const std::string& path) const {
    const auto parts = partsOf(path);
    const auto share = std::ranges::find(world_.shares, parts.at(0), &Share::name);
    if (share == world_.shares.end()) {
        return std::nullopt;
    }
    const auto number = static_cast<std::size_t>(share - world_.shares.begin());
    const Place place = walk(world_.tree, share->path, &account_);
    if (!place.found || place.path == "/") {
        return std::nullopt;
    }
    const auto folder = walkBelow(world_.tree, place.path, path.substr(parts[0].size() + 1), account_);
    if (!folder) {
        return std::nullopt;
    }
    const Access access = leastWithin(*folder, place.path, on(number));
    if (access == Access::none || !mayEnter(*folder)) {
        return std::nullopt;
    }
    View view;
    mount(view, {-1, 0, "", world_.tree.at(*folder)->id, access}, *folder);
    addLimits(view);
    return view;
}

View Policy::allShares() const {
    View view;
    view.sideBySide = true;
    for (std::size_t i = 0; i < places_.size(); i++) {
        const Place place = walk(world_.tree, world_.shares[i].path, &account_);
        const Access access = world_.shares[i].offered ? on(i) : Access::none;
        if (access == Access::none || !place.found || place.path == "/") {
            continue;
        }
        mount(view, {-1, 0, world_.shares[i].name, world_.tree.at(place.path)->id, access}, place.path);
    }
    addLimits(view);
    return view;
}

std::optional<View> Policy::guests() const {
    const std::string& name = world_.switches.guestsShare;
    if (name.empty()) {
        return allShares();
    }
    const auto share = std::ranges::find(world_.shares, name, &Share::name);
    return share == world_.shares.end() || !share->offered ? std::nullopt : inShare("/" + name);
}

// Also the folders of the shares in it, and those on the way to them, each a mount that cannot be moved.
void Policy::mount(View& view, Mount shown, const std::string& place) const {
    std::map<std::string, int> mounted{{place, static_cast<int>(view.mounts.size())}};
    view.mounts.push_back(shown);
    if (shown.access == Access::write) {
        keepRuleFolders(view.kept, place);
    }
    std::set<std::string> pinned;
    for (const Place& inner : places_) {
        for (std::string way = inner.path; inner.found && isStrictlyWithin(way, place); way = parentOf(way)) {
            pinned.insert(way);
        }
    }
    for (const std::string& folder : pinned) {
        std::string around = parentOf(folder);
        while (!mounted.contains(around)) {
            around = parentOf(around);
        }
        const int outer = mounted.at(around);
        const Access access = leastWithin(folder, place, shown.access);
        if (view.mounts[static_cast<std::size_t>(outer)].access == Access::none) {
            continue;
        }
        mounted[folder] = static_cast<int>(view.mounts.size());
        const std::uint64_t id = world_.tree.at(folder)->id;
        view.mounts.push_back({outer, id, "", id, access});
    }
}

void Policy::keepWay(KeptNames& kept, std::string here, std::vector<std::string> rest) const {
    for (int links = 0; !rest.empty() && links <= 40;) {
        const std::string name = rest.front();
        rest.erase(rest.begin());
        const std::string place = join(here, name);
        const Node* const node = world_.tree.at(place);
        if (node == nullptr) {
            kept.absent.insert({world_.tree.at(here)->id, lowerCase(name)});
            return;
        }
        kept.objects.insert(node->id);
        if (node->kind == Kind::file) {
            return;
        }
        if (node->kind == Kind::folder) {
            here = place;
            continue;
        }
        auto target = partsOf(node->text);
        if (node->text.starts_with('/') || std::ranges::find(target, "..") != target.end()) {
            return;
        }
        links++;
        target.insert(target.end(), rest.begin(), rest.end());
        rest = target;
    }
}

// Whoever moved one of them could put another in its place.
void Policy::keepRuleFolders(KeptNames& kept, const std::string& shown) const {
    for (const Rule& rule : world_.rules) {
        auto parts = partsOf(rule.path);
        const auto share = std::ranges::find(world_.shares, parts.at(0), &Share::name);
        const auto number = static_cast<std::size_t>(share - world_.shares.begin());
        if (rule.path == "/home" || share == world_.shares.end() || !places_[number].found) {
            continue;
        }
        std::string place = places_[number].path;
        for (auto part = parts.begin() + 1; part != parts.end(); ++part) {
            place = join(place, *part);
        }
        if (parts.size() > 1 && isStrictlyWithin(place, shown)) {
            keepWay(kept, shown, partsOf(shown == "/" ? place : place.substr(shown.size())));
        }
    }
}

void Policy::addLimits(View& view) const {
    for (std::size_t i = 0; i < places_.size(); i++) {
        if (places_[i].found) {
            view.limits.push_back({world_.tree.at(places_[i].path)->id, places_[i].path, on(i)});
        }
    }
}

} // namespace

const std::vector<Account>& accounts() {
    static const std::vector<Account> all{{"alice", 1001, {1001, 2001}, "/mnt/home/alice"},
                                          {"bob", 1002, {1002, 2001}, "/mnt/home/bob"},
                                          {"carol", 1003, {1003, 2002}, "/mnt/home/carol"},
                                          {"ftp", 104, {65534}, "/srv/ftp"}};
    return all;
}

const Account& accountOf(const std::string& name) {
    const auto found = std::ranges::find(accounts(), name, &Account::name);
    if (found == accounts().end()) {
        throw std::invalid_argument("no account " + name);
    }
    return *found;
}

std::optional<unsigned> groupNumber(const std::string& name) {
    static const std::map<std::string, unsigned> groups{
        {"alice", 1001}, {"bob", 1002}, {"carol", 1003}, {"staff", 2001}, {"velt-admin", 2002}};
    const auto found = groups.find(name);
    return found == groups.end() ? std::nullopt : std::optional(found->second);
}

std::optional<View> viewOf(const World& world, const Account& account) {
    return Policy(world, account).view();
}

// Those of the documented names that are used here.
bool isObeyed(const Account& account, const std::string& place, const std::string& root) {
    return std::ranges::any_of(std::initializer_list<const char*>{".ssh", ".profile"}, [&](const char* name) {
        const std::string obeyed = join(account.home, name);
        return isWithin(place, obeyed) && !isStrictlyWithin(root, obeyed);
    });
}

bool mayReach(const Tree& tree, const View& view, const std::string& place, Access access) {
    for (std::string folder = place;; folder = parentOf(folder)) {
        const Node* node = tree.at(folder);
        bool limited = folder == "/";
        for (const Limit& limit : view.limits) {
            if (node == nullptr || limit.folder != node->id) {
                continue;
            }
            if (limit.access >= access) {
                return true;
            }
            limited = limited || limit.place == folder;
        }
        if (limited) {
            return false;
        }
    }
}

} // namespace velt::model
