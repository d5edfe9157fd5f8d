#include "standalone/login/view_mounts.h"

#include "standalone/core/error_number.h"
#include "standalone/login/open_folder.h"

#include <fcntl.h>
#include <sys/mount.h>
#include <sys/stat.h>

#include <algorithm>
#include <cerrno>
#include <cstring>

namespace velt {
namespace {

Error failed(const std::string& what, int error = errno) {
    return {ErrorNumber::daemon, what + ": " + std::strerror(error) + "."};
}

Result<> outcome(bool good, const std::string& what) {
    return good ? Result<>() : failed(what);
}

// A second mount of the folder and of what is mounted below it, not yet attached. It adds to what the mounts
// are restricted by already; a plain remount would lift that. What is mounted on the server later stays away,
// since that would come without the restrictions.
UniqueFd mountOf(const UniqueFd& folder, Access access) {
    UniqueFd tree(
        open_tree(folder.get(), "", OPEN_TREE_CLONE | OPEN_TREE_CLOEXEC | AT_EMPTY_PATH | AT_RECURSIVE));
    mount_attr attributes{};
    attributes.attr_set =
        MOUNT_ATTR_NOSUID | MOUNT_ATTR_NODEV | (access == Access::write ? 0U : MOUNT_ATTR_RDONLY);
    attributes.propagation = MS_PRIVATE;
    if (!tree ||
        mount_setattr(tree.get(), "", AT_EMPTY_PATH | AT_RECURSIVE, &attributes, sizeof attributes) != 0) {
        return UniqueFd();
    }
    return tree;
}

// A folder that cannot even be listed.
UniqueFd nothing() {
    const UniqueFd context(fsopen("tmpfs", FSOPEN_CLOEXEC));
    if (!context || fsconfig(context.get(), FSCONFIG_SET_STRING, "mode", "0000", 0) != 0 ||
        fsconfig(context.get(), FSCONFIG_SET_STRING, "size", "4k", 0) != 0 ||
        fsconfig(context.get(), FSCONFIG_CMD_CREATE, nullptr, nullptr, 0) != 0) {
        return UniqueFd();
    }
    return UniqueFd(fsmount(context.get(), FSMOUNT_CLOEXEC,
                            MOUNT_ATTR_RDONLY | MOUNT_ATTR_NOSUID | MOUNT_ATTR_NODEV | MOUNT_ATTR_NOEXEC));
}

bool attach(const UniqueFd& tree, const UniqueFd& place) {
    return move_mount(tree.get(), "", place.get(), "", MOVE_MOUNT_F_EMPTY_PATH | MOVE_MOUNT_T_EMPTY_PATH) ==
           0;
}

bool isWithin(const std::filesystem::path& place, const std::filesystem::path& outer) {
    return std::mismatch(outer.begin(), outer.end(), place.begin(), place.end()).first == outer.end();
}

Result<> coverOne(const UniqueFd& tree, const Restriction& restriction) {
    const auto folder = openFolderExactly(tree, restriction.place);
    if (!folder) {
        return folder.error();
    }
    const UniqueFd cover =
        restriction.access == Access::none ? nothing() : mountOf(*folder, restriction.access);
    return outcome(cover && attach(cover, *folder),
                   "The folder " + restriction.place.string() + " of another share cannot be restricted");
}

Result<> restrictWithin(const UniqueFd& tree, const std::vector<Restriction>& restrictions) {
    std::vector<std::filesystem::path> hidden;
    for (const Restriction& restriction : restrictions) {
        const std::filesystem::path& place = restriction.place;
        if (std::ranges::any_of(hidden, [&](const auto& outer) { return isWithin(place, outer); })) {
            continue;
        }
        if (const Result<> done = coverOne(tree, restriction); !done) {
            return done;
        }
        if (restriction.access == Access::none) {
            hidden.push_back(place);
        }
    }
    return {};
}

/// The folder's mount, with all of its rights, at `place`.
Result<UniqueFd> mountAt(const std::filesystem::path& place, const VisibleFolder& visible) {
    const auto where = openFolder(place);
    if (!where) {
        return where.error();
    }
    UniqueFd tree = mountOf(visible.folder, visible.access);
    if (!tree || !attach(tree, *where)) {
        return failed("The folder cannot be mounted");
    }
    return tree;
}

} // namespace

Result<> isolateMounts() {
    // What the server unmounts goes here, too, so that a session does not keep it.
    return outcome(mount(nullptr, "/", nullptr, MS_REC | MS_SLAVE, nullptr) == 0,
                   "The mounts of the session cannot be separated");
}

Result<> showFolder(const std::filesystem::path& root, const VisibleFolder& visible) {
    const auto tree = mountAt(root, visible);
    return tree ? restrictWithin(*tree, visible.restrictions) : tree.error();
}

Result<> SideBySide::begin() {
    return outcome(mount("velt-shares", root_.c_str(), "tmpfs", MS_NOSUID | MS_NODEV | MS_NOEXEC,
                         "mode=0755,size=16m") == 0,
                   "The folder of the shares cannot be mounted");
}

Result<> SideBySide::add(const std::string& name, const VisibleFolder& visible) {
    const std::filesystem::path place = root_ / name;
    if (mkdir(place.c_str(), 0755) < 0) {
        return failed("The place of the share cannot be made");
    }
    const auto tree = mountAt(place, visible);
    const Result<> shown = tree ? restrictWithin(*tree, visible.restrictions) : tree.error();
    // It must not stay there with more rights than it should give.
    if (!shown && ((tree && umount2(place.c_str(), MNT_DETACH) < 0) || rmdir(place.c_str()) < 0)) {
        spoiled_ = true;
    }
    return shown;
}

Result<> SideBySide::finish() {
    if (spoiled_) {
        return Error(ErrorNumber::daemon,
                     "A share that could not be restricted could not be taken away again.");
    }
    return outcome(mount(nullptr, root_.c_str(), nullptr,
                         MS_REMOUNT | MS_BIND | MS_RDONLY | MS_NOSUID | MS_NODEV, nullptr) == 0,
                   "The folder of the shares cannot be made read-only");
}

} // namespace velt
