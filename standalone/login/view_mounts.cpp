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

// Another mount of the folder, with all mounts below it, not yet attached. Existing restrictions of these
// mounts stay; a plain remount would lift them. What the server mounts later does not appear in it, since
// that would come without the restrictions.
UniqueFd mountOf(const UniqueFd& folder, Access access) {
    UniqueFd tree(
        open_tree(folder.get(), "", OPEN_TREE_CLONE | OPEN_TREE_CLOEXEC | AT_EMPTY_PATH | AT_RECURSIVE));
    mount_attr attributes{};
    // Not executable: the daemon, which can get root's rights back, must not load a library from there.
    attributes.attr_set = MOUNT_ATTR_NOSUID | MOUNT_ATTR_NODEV | MOUNT_ATTR_NOEXEC |
                          (access == Access::write ? 0U : MOUNT_ATTR_RDONLY);
    attributes.propagation = MS_PRIVATE;
    if (!tree ||
        mount_setattr(tree.get(), "", AT_EMPTY_PATH | AT_RECURSIVE, &attributes, sizeof attributes) != 0) {
        return UniqueFd();
    }
    return tree;
}

// An empty folder that cannot even be listed.
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
    VELT_ASSIGN_OR_RETURN(const auto folder, openFolderExactly(tree, restriction.place));
    const UniqueFd cover =
        restriction.access == Access::none ? nothing() : mountOf(folder, restriction.access);
    return outcome(cover && attach(cover, folder),
                   "Cannot restrict the folder " + restriction.place.string() + " of another share");
}

Result<> restrictWithin(const UniqueFd& tree, const std::vector<Restriction>& restrictions) {
    std::vector<std::filesystem::path> hidden;
    for (const Restriction& restriction : restrictions) {
        const std::filesystem::path& place = restriction.place;
        if (std::ranges::any_of(hidden, [&](const auto& outer) { return isWithin(place, outer); })) {
            continue;
        }
        VELT_RETURN_IF_ERROR(coverOne(tree, restriction));
        if (restriction.access == Access::none) {
            hidden.push_back(place);
        }
    }
    return {};
}

/// Mounts the folder at `place`, without its restrictions yet.
Result<UniqueFd> mountAt(const std::filesystem::path& place, const VisibleFolder& visible) {
    VELT_ASSIGN_OR_RETURN(const auto where, openFolder(place));
    UniqueFd tree = mountOf(visible.folder, visible.access);
    if (!tree || !attach(tree, where)) {
        return failed("Cannot mount the folder");
    }
    return tree;
}

} // namespace

Result<> isolateMounts() {
    // Slave, not private: what the server unmounts goes away here as well, so that no session keeps it busy.
    return outcome(mount(nullptr, "/", nullptr, MS_REC | MS_SLAVE, nullptr) == 0,
                   "Cannot separate the mounts of the session from the server's");
}

Result<> showFolder(const std::filesystem::path& root, const VisibleFolder& visible) {
    VELT_ASSIGN_OR_RETURN(const auto tree, mountAt(root, visible));
    return restrictWithin(tree, visible.restrictions);
}

Result<> SideBySide::begin() {
    return outcome(mount("velt-shares", root_.c_str(), "tmpfs", MS_NOSUID | MS_NODEV | MS_NOEXEC,
                         "mode=0755,size=16m") == 0,
                   "Cannot mount the folder of the shares");
}

Result<> SideBySide::add(const std::string& name, const VisibleFolder& visible) {
    const std::filesystem::path place = root_ / name;
    if (mkdir(place.c_str(), 0755) < 0) {
        return failed("Cannot make the folder of the share");
    }
    const auto tree = mountAt(place, visible);
    Result<> shown = tree ? restrictWithin(*tree, visible.restrictions) : tree.error();
    // A share without its restrictions must not stay.
    if (!shown && ((tree && umount2(place.c_str(), MNT_DETACH) < 0) || rmdir(place.c_str()) < 0)) {
        spoiled_ = true;
    }
    return shown;
}

Result<> SideBySide::finish() {
    if (spoiled_) {
        return Error(ErrorNumber::daemon, "Cannot remove a share that could not be restricted.");
    }
    return outcome(mount(nullptr, root_.c_str(), nullptr,
                         MS_REMOUNT | MS_BIND | MS_RDONLY | MS_NOSUID | MS_NODEV | MS_NOEXEC, nullptr) == 0,
                   "Cannot make the folder of the shares read-only");
}

} // namespace velt
