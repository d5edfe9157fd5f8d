// What users of the service do.
#include "tests/model/generator.h"

namespace velt::model {

std::string Generator::sessionName() {
    return anyOf({"s1", "s2", "s3", "s4"});
}

std::string Generator::viewPath(const Runner& runner, const Session& session, bool folder) {
    const Tree& tree = runner.world().tree;
    if (chance(3)) {
        return anyOf({"/", "/apart/secret", "/mnt/srv/apart/secret", "/..", "/one", "/mnt", "/f", "/a"});
    }
    for (int attempt = 0; attempt < 20 && !session.view.mounts.empty(); attempt++) {
        const Mount& mount = oneOf(session.view.mounts);
        const std::string root = tree.placeOf(mount.folder);
        const std::string place = chance(35)             ? placeOfNote(runner.world())
                                  : folder || chance(25) ? folderIn(tree)
                                                         : placeIn(tree);
        if (mount.parent < 0 && !root.empty() && isWithin(place, root)) {
            const std::string path = (mount.name.empty() ? "" : "/" + mount.name) + place.substr(root.size());
            return path.empty() ? "/" : path;
        }
    }
    return "/";
}

Step Generator::logIn(const std::string& session) {
    Step step{"login", session, anyOf({"alice", "alice", "alice", "bob", "bob", "carol", "ftp"})};
    if (step[2] != "ftp" && chance(overSftp_)) {
        step.push_back("sftp");
    }
    return step;
}

// The path of what is mounted in another mount, as an attacker would try to get rid of it; "" when nothing
// is.
std::string Generator::mountedPath(const Runner& runner, const View& view) {
    std::vector<const Mount*> inner;
    for (const Mount& mount : view.mounts) {
        if (mount.parent >= 0) {
            inner.push_back(&mount);
        }
    }
    if (inner.empty()) {
        return "";
    }
    const Mount* outer = oneOf(inner);
    const std::string place = runner.world().tree.placeOf(outer->folder);
    while (outer->parent >= 0) {
        outer = &view.mounts[static_cast<std::size_t>(outer->parent)];
    }
    const std::string root = runner.world().tree.placeOf(outer->folder);
    const bool within = !root.empty() && isWithin(place, root);
    return within ? (outer->name.empty() ? "" : "/" + outer->name) + place.substr(root.size()) : "";
}

Step Generator::ask(const Runner& runner) {
    const auto& [name, session] = oneOf(runner.sessions());
    const std::string mounted = chance(15) ? mountedPath(runner, session.view) : "";
    if (!mounted.empty()) {
        return chance(80) ? Step{"rename", name, mounted, join(parentOf(mounted), this->name())}
                          : Step{"remove-folder", name, mounted};
    }
    if (session.protocol == Protocol::sftp && chance(45)) {
        return askOverSftp(runner, name, session);
    }
    const std::string path = viewPath(runner, session, false);
    const std::string around = viewPath(runner, session, true);
    const std::string fresh = join(around, chance(5) ? anyOf({".ssh", ".profile"}) : this->name());
    switch (below(16)) {
    case 0:
        return {"enter", name, path};
    case 1:
    case 2:
        return {anyOf({"list", "names", "facts"}), name, path};
    case 3:
    case 4:
    case 5:
        return {"read", name, path};
    case 6:
    case 7:
        return {anyOf({"write", "append"}), name, chance(50) ? path : fresh};
    case 8:
    case 9:
        return {"make", name, fresh};
    case 10:
        return {"remove-folder", name, around};
    case 11:
        return {"remove", name, path};
    case 12:
        return {"chmod", name, path, mode()};
    default:
        return {"rename", name, chance(50) ? path : around, fresh};
    }
}

Step Generator::askOverSftp(const Runner& runner, const std::string& name, const Session& session) {
    if (session.opened && chance(35)) {
        const std::string verb = anyOf({"read-open", "write-open", "chmod-open"});
        return verb == "chmod-open" ? Step{verb, name, mode()} : Step{verb, name};
    }
    const std::string path = viewPath(runner, session, false);
    const std::string around = viewPath(runner, session, true);
    const std::string fresh = join(around, chance(5) ? anyOf({".ssh", ".profile"}) : this->name());
    switch (below(10)) {
    case 0:
    case 1:
        return {"replace", name, chance(60) ? path : around, chance(60) ? fresh : path};
    case 2:
    case 3:
        return {"twin", name, path, fresh};
    case 4:
    case 5:
        return {"symlink", name, fresh, chance(60) ? target() : viewPath(runner, session, true)};
    case 6:
        return {"cut", name, path};
    case 7:
        return {"times", name, path};
    default:
        return {anyOf({"open-to-read", "open-to-write"}), name, chance(80) ? path : fresh};
    }
}

} // namespace velt::model
