#include "tests/model/generator.h"

#include <algorithm>

namespace velt::model {
namespace {

const std::vector<std::string> users{"alice", "bob", "carol"};
const std::vector<std::string> shareNames{"one", "two", "three", "four"};

bool isDeeper(const std::string& one, const std::string& other) {
    return std::ranges::count(one, '/') < std::ranges::count(other, '/');
}

} // namespace

std::string Generator::name() {
    return anyOf({"a", "b", "c", "inner", "f", "l"});
}

std::string Generator::mode() {
    return chance(82) ? "777" : anyOf({"755", "700", "750", "770", "711", "555"});
}

std::string Generator::owner() {
    return anyOf({"root", "root", "alice", "bob"});
}

std::string Generator::target() {
    if (!folders_.empty() && chance(40)) {
        return oneOf(folders_);
    }
    return anyOf({"/", "/mnt/srv/apart", "/mnt/srv/apart/secret", "..", "../..", "../../apart", "a",
                  "b/inner", "f", "../f", "/one", "/two/f", "/one/a", "inner", "l", "../other/a",
                  "/mnt/home/bob", "/absent"});
}

std::string Generator::grant() {
    return anyOf({"write", "write", "write", "read", "read", "none"});
}

Step Generator::share(const std::string& name) {
    std::string path =
        anyOf({"/mnt/srv/way", "/mnt/srv/way/a", "/mnt/home", "/mnt/home/alice/a", "/mnt/home/bob",
               "/mnt/srv/absent", "/mnt/srv/outer/l", "/mnt/srv/outer/a/inner", "/"});
    if (chance(85)) {
        path = oneOf(folders_);
    }
    if (chance(50)) {
        path = std::max(path, oneOf(folders_), isDeeper);
    }
    Step step{"share", name, path};
    for (const char* user : {"alice", "bob", "carol", "ftp"}) {
        if (chance(70)) {
            step.push_back(std::string(user) + "=" + grant());
        }
    }
    for (const char* group : {"@staff", "@velt-admin"}) {
        if (chance(25)) {
            step.push_back(std::string(group) + "=" + grant());
        }
    }
    if (chance(3)) {
        step.push_back("@ghosts=none");
    }
    if (chance(7)) {
        step.push_back("hidden");
    }
    return step;
}

Step Generator::rules() {
    Step step{"rules"};
    for (const char* who : {"alice", "bob", "@staff", "@velt-admin"}) {
        if (chance(35)) {
            std::string path = chance(30) ? "/home" : "/" + oneOf(shareNames);
            for (int more = below(3); more > 0 && path != "/home"; more--) {
                path += "/" + (chance(50) ? "l" : name());
            }
            step.push_back(who + ("=" + path));
        }
    }
    return step;
}

Step Generator::switches() {
    const Switches& one = oneOf(possibleSwitches());
    const std::string guests = one.guestsShare.empty() ? "guests" : "guests=" + one.guestsShare;
    return {"switches", one.confined ? "home" : "shares", one.anonymous ? guests : "nobody"};
}

void Generator::addFolders(Steps& steps) {
    folders_ = {"/mnt/srv/outer", "/mnt/srv/other"};
    for (const std::string& folder : folders_) {
        steps.push_back({"folder", folder, owner(), chance(85) ? "777" : mode()});
    }
    for (int more = 4 + below(6); more > 0; more--) {
        const std::string around = chance(12) ? "/mnt/home/" + anyOf({"alice", "bob"}) : oneOf(folders_);
        const std::string folder = join(around, anyOf({"a", "b", "inner"}));
        if (std::ranges::find(folders_, folder) == folders_.end()) {
            folders_.push_back(folder);
            steps.push_back({"folder", folder, owner(), mode()});
        }
    }
    if (chance(30)) {
        steps.push_back({"folder", "/mnt/home/alice/.ssh", "alice", "777"});
        steps.push_back({"file", "/mnt/home/alice/.ssh/f", "alice", "666"});
        steps.push_back({"file", "/mnt/home/alice/.profile", "alice", "666"});
    }
    for (const std::string& folder : folders_) {
        if (chance(80)) {
            steps.push_back(
                {"file", join(folder, "f"), owner(), chance(80) ? "666" : anyOf({"644", "600", "444"})});
        }
    }
}

Steps Generator::world() {
    planned_.clear();
    Steps steps{{"folder", "/mnt/srv/apart", "root", "755"},
                {"file", "/mnt/srv/apart/secret", "root", "666"}};
    addFolders(steps);
    if (chance(50)) {
        steps.push_back({"link", "/mnt/srv/way", oneOf(folders_)});
    }
    for (int more = below(4); more > 0; more--) {
        steps.push_back({"link", join(oneOf(folders_), anyOf({"l", "l", "a", "inner"})), target()});
    }
    for (const std::string& one : shareNames) {
        if (one == shareNames[0] && chance(70)) {
            steps.push_back({"share", one, folders_[0], "alice=write", "bob=" + grant(), "ftp=" + grant()});
        } else if (chance(80)) {
            steps.push_back(share(one));
        }
    }
    if (const Step last = steps.back(); last[0] == "share" && chance(40)) {
        steps.push_back({"link", join(last[2], "l"), target()});
        steps.push_back({"rules", "alice=/" + last[1] + "/l", "@staff=/" + last[1]});
    } else if (chance(40)) {
        steps.push_back(rules());
    }
    if (chance(50)) {
        steps.push_back(switches());
    }
    return steps;
}

std::string Generator::folderIn(const Tree& tree) {
    std::vector<std::string> all;
    for (const auto& [path, node] : tree.nodes) {
        if (node.kind == Kind::folder && path.size() > sizeof "/mnt/home") {
            all.push_back(path);
        }
    }
    return oneOf(all);
}

std::string Generator::placeIn(const Tree& tree) {
    std::vector<std::string> all;
    for (const auto& [path, node] : tree.nodes) {
        if (path.size() > sizeof "/mnt/home") {
            all.push_back(path);
        }
    }
    return oneOf(all);
}

// The folder of a share or one on the way to it.
std::string Generator::placeOfNote(const World& world) {
    if (world.shares.empty()) {
        return folderIn(world.tree);
    }
    std::string place = walk(world.tree, oneOf(world.shares).path).path;
    for (int up = below(3); up > 0 && parentOf(place).size() > sizeof "/mnt/home"; up--) {
        place = parentOf(place);
    }
    return place;
}

Step Generator::administer(const Runner& runner) {
    const Tree& tree = runner.world().tree;
    const int what = below(10);
    if (what < 5) {
        folders_ = {folderIn(tree), folderIn(tree), folderIn(tree)};
        return share(oneOf(shareNames));
    }
    if (what == 5) {
        return {"unshare", oneOf(shareNames)};
    }
    if (what == 6) {
        return rules();
    }
    if (what == 7) {
        return switches();
    }
    const std::string place = join(folderIn(tree), name());
    return what == 8 ? Step{"folder", place, owner(), mode()} : Step{"file", place, owner(), "666"};
}

Step Generator::inShell(const Runner& runner) {
    const Tree& tree = runner.world().tree;
    const std::string user = oneOf(users);
    const std::string fresh = join(folderIn(tree), name());
    const std::string place = chance(40) ? placeOfNote(runner.world()) : placeIn(tree);
    switch (below(10)) {
    case 0:
    case 1:
        return {"shell", user, "mkdir", fresh};
    case 2:
        return {"shell", user, "ln", target(), fresh};
    case 3:
        return chance(70) ? Step{"shell", user, "ln", target(), fresh}
                          : Step{"shell", user, "twin", place, fresh};
    case 4:
    case 5:
    case 6:
        return {"shell", user, "mv", place, fresh};
    case 7:
        return {"shell", user, "rm", place};
    case 8:
        return {"shell", user, "rmdir", place};
    default:
        return chance(50) ? Step{"shell", user, "write", fresh} : Step{"shell", user, "chmod", mode(), place};
    }
}

void Generator::lookAround(const std::string& session, const std::vector<Share>& shares) {
    for (const Share& share : shares) {
        const std::string folder = "/" + share.name;
        planned_.push_back({"names", session, folder});
        planned_.push_back(
            {"read", session, join(folder, anyOf({"f", "secret", "apart/secret", "inner/f", "a/f"}))});
        planned_.push_back({"write", session, join(folder, anyOf({"f", "secret", "new", "b"}))});
    }
}

// What an attacker would do: take a folder away that leads to a share, and lay something in its place.
void Generator::putInTheWay(const Runner& runner, const std::string& way) {
    const std::string user = oneOf(users);
    planned_.push_back(
        {"shell", user, "mv", way, join(chance(50) ? parentOf(way) : folderIn(runner.world().tree), name())});
    const std::string laid = chance(50) ? target() : folderIn(runner.world().tree);
    planned_.push_back(chance(70) ? Step{"shell", user, "ln", laid, way} : Step{"shell", user, "mkdir", way});
}

void Generator::attack(const Runner& runner) {
    const auto& shares = runner.world().shares;
    if (shares.empty()) {
        return;
    }
    const std::string way = placeOfNote(runner.world());
    if (!isWithin(way, "/mnt/srv") && !isWithin(way, "/mnt/home")) {
        return;
    }
    if (chance(60)) {
        putInTheWay(runner, way);
    }
    const std::string session = sessionName();
    planned_.push_back(logIn(session));
    lookAround(session, shares);
}

Step Generator::next(const Runner& runner) {
    if (planned_.empty() && chance(5)) {
        attack(runner);
    }
    if (!planned_.empty()) {
        Step step = planned_.front();
        planned_.pop_front();
        return step;
    }
    const int what = below(100);
    if (what < 9 || runner.sessions().empty()) {
        return what < 80 ? logIn(sessionName()) : administer(runner);
    }
    if (what < 13) {
        return administer(runner);
    }
    return what < 20 ? inShell(runner) : ask(runner);
}

} // namespace velt::model
