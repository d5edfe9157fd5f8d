#include "host/trial/trial_place.h"

#include "base/ask_child.h"
#include "host/trial/trial_error.h"

#include <grp.h>
#include <pwd.h>
#include <sched.h>
#include <sys/mount.h>
#include <sys/stat.h>
#include <unistd.h>

namespace velt::host {

namespace {

constexpr const char* mountPoint = "/media";
constexpr const char* mountedRoot = "/media/velt";

bool mayEnter(const passwd& account, const std::filesystem::path& folder) {
    const auto answer = askChild([&] {
        return ::setgroups(0, nullptr) == 0 && ::setgid(account.pw_gid) == 0 &&
               ::setuid(account.pw_uid) == 0 && ::access(folder.c_str(), X_OK) == 0;
    });
    return answer == 1;
}

} // namespace

bool mayMount() {
    return askChild([] { return ::unshare(CLONE_NEWNS) == 0 ? 1 : 0; }) == 1;
}

TrialPlace findPlace(const std::filesystem::path& folder) {
    if (::geteuid() != 0) {
        return {folder, false};
    }
    const passwd* const account = ::getpwnam("ftp"); // NOLINT(concurrency-mt-unsafe)
    if (account == nullptr) {
        throw TrialError("There is no account ftp. Install the package proftpd-core, which creates it.");
    }
    if (mayEnter(*account, folder)) {
        return {folder, false};
    }
    if (!mayMount()) {
        throw TrialError(
            "The account ftp, which serves anonymous users, cannot reach " + folder.string() +
            ": a folder on the way is closed to it.\nMove this tree to a folder that everybody may "
            "enter, such as /srv, and start again.");
    }
    return {mountedRoot, true};
}

bool mountPlace(const std::filesystem::path& folder, const TrialPlace& place) {
    return ::unshare(CLONE_NEWNS) == 0 && ::mount(nullptr, "/", nullptr, MS_REC | MS_PRIVATE, nullptr) == 0 &&
           ::mount("velt", mountPoint, "tmpfs", 0, "mode=755") == 0 &&
           ::mkdir(place.root.c_str(), 0755) == 0 &&
           ::mount(folder.c_str(), place.root.c_str(), nullptr, MS_BIND, nullptr) == 0;
}

} // namespace velt::host
