#include "standalone/login/view_mounts.h"

#include "standalone/core/last_error.h"
#include "standalone/login/open_folder.h"

#include <fcntl.h>
#include <sys/mount.h>
#include <sys/stat.h>

#include <algorithm>
#include <cerrno>
#include <cstring>

namespace velt {
namespace {

bool failed(const std::string& what) {
    fail(ErrorNumber::daemon, what + ": " + std::strerror(errno) + ".");
    return false;
}

// A second mount of the folder and of what is mounted below it, not yet attached. It adds to what the mounts
// are restricted by already; a plain remount would lift that. What is mounted on the server later stays away,
// since that would come without the restrictions.
UniqueFd mountOf(const UniqueFd& folder, bool readOnly) {
    UniqueFd tree(
        open_tree(folder.get(), "", OPEN_TREE_CLONE | OPEN_TREE_CLOEXEC | AT_EMPTY_PATH | AT_RECURSIVE));
    mount_attr attributes{};
    attributes.attr_set = MOUNT_ATTR_NOSUID | MOUNT_ATTR_NODEV | (readOnly ? MOUNT_ATTR_RDONLY : 0U);
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

bool restrictWithin(const UniqueFd& tree, const std::vector<Restriction>& restrictions) {
    std::vector<std::filesystem::path> hidden;
    for (const Restriction& restriction : restrictions) {
        const std::filesystem::path& place = restriction.place;
        if (std::ranges::any_of(hidden, [&](const auto& outer) { return isWithin(place, outer); })) {
            continue;
        }
        const UniqueFd folder = openFolderExactly(tree, place);
        if (!folder) {
            return failed("The folder " + place.string() + " of another share cannot be opened");
        }
        const UniqueFd cover = restriction.hidden ? nothing() : mountOf(folder, true);
        if (!cover || !attach(cover, folder)) {
            return failed("The folder " + place.string() + " of another share cannot be restricted");
        }
        if (restriction.hidden) {
            hidden.push_back(place);
        }
    }
    return true;
}

// Whether `place` has been changed is told in any case.
bool show(const UniqueFd& place, const VisibleFolder& visible, bool& attached) {
    attached = false;
    const UniqueFd tree = mountOf(visible.folder, visible.readOnly);
    if (!place || !tree || !attach(tree, place)) {
        return failed("The folder cannot be mounted");
    }
    attached = true;
    return restrictWithin(tree, visible.restrictions);
}

} // namespace

bool isolateMounts() {
    // What the server unmounts goes here, too, so that a session does not keep it.
    return mount(nullptr, "/", nullptr, MS_REC | MS_SLAVE, nullptr) == 0 ||
           failed("The mounts of the session cannot be separated");
}

bool showFolder(const std::filesystem::path& root, const VisibleFolder& visible) {
    bool attached = false;
    return show(openFolder(root), visible, attached);
}

bool SideBySide::begin() {
    return mount("velt-shares", root_.c_str(), "tmpfs", MS_NOSUID | MS_NODEV | MS_NOEXEC,
                 "mode=0755,size=16m") == 0 ||
           failed("The folder of the shares cannot be mounted");
}

bool SideBySide::add(const std::string& name, const VisibleFolder& visible) {
    const std::filesystem::path place = root_ / name;
    if (mkdir(place.c_str(), 0755) < 0) {
        return failed("The place of the share cannot be made");
    }
    bool attached = false;
    if (show(openFolder(place), visible, attached)) {
        return true;
    }
    // It must not stay there with more rights than it should give.
    if ((attached && umount2(place.c_str(), MNT_DETACH) < 0) || rmdir(place.c_str()) < 0) {
        spoiled_ = true;
    }
    return false;
}

bool SideBySide::finish() {
    if (spoiled_) {
        fail(ErrorNumber::daemon, "A share that could not be restricted could not be taken away again.");
        return false;
    }
    return mount(nullptr, root_.c_str(), nullptr, MS_REMOUNT | MS_BIND | MS_RDONLY | MS_NOSUID | MS_NODEV,
                 nullptr) == 0 ||
           failed("The folder of the shares cannot be made read-only");
}

} // namespace velt
