#include "base/file.h"
#include "standalone/accounts/user_directory.h"
#include "standalone/core/paths.h"
#include "standalone/core/state_root.h"
#include "standalone/health/checks.h"
#include "standalone/health/mends.h"
#include "standalone/settings/settings.h"
#include "standalone/shares/share_access.h"
#include "standalone/shares/share_store.h"

#include <unistd.h>

#include <algorithm>
#include <optional>

namespace velt {
namespace {

constexpr const char* account = "ftp";
constexpr const char* refused = " Every anonymous login is refused.";

Finding keptOut(const std::string& sentence, std::string mend) {
    return {"anonymous-kept-out", Severity::error, "ftp", sentence + refused, std::move(mend)};
}

/// The name of the share that anonymous users are confined to; nothing where they are not, or nobody logs in.
std::optional<std::string> shareForGuests() {
    const auto settings = loadFtpSettings();
    const bool confined = settings && enablesFtp(settings->record) && settings->record.anonymous != 0 &&
                          settings->record.anonymous_chroot != 0;
    // Without root's rights a login has no view of its own.
    return confined && ::geteuid() == 0 ? std::optional(settings->record.anonymous_chroot_share)
                                        : std::nullopt;
}

std::optional<Finding> judgeFolder(const ShareEntry& share, const std::string& which) {
    if (const auto there = isThere(share.path); there && !*there) {
        return keptOut("The folder " + share.path + " of the " + which + " is missing.",
                       "Put your copy back, or, for an empty one, run: install -d " + shellWord(share.path));
    }
    const auto access = accessOf(account, share);
    if (access && access->value_or(Access::none) != Access::none) {
        return std::nullopt;
    }
    return keptOut(access ? "The folder " + share.path + " of the " + which + " is closed to the account ftp."
                          : access.error().message,
                   "Let the account ftp read the folder, and enter those on the way to it, which this "
                   "shows: namei -l " +
                       shellWord(share.path));
}

} // namespace

Findings anonymousFindings() {
    const auto name = shareForGuests();
    const auto shares = loadShares();
    const auto user = name ? userByName(account) : std::nullopt;
    if (!shares || !user) { // other checks tell why
        return {};
    }
    const std::string which = "share \"" + *name + "\", which anonymous FTP users are confined to,";
    const std::string edit = " in " + statePath(paths::shares).string() + ", then run: veltctl doctor";
    const auto share = std::ranges::find(*shares, *name, &ShareEntry::name);
    if (share == shares->end()) {
        return {keptOut("The " + which + " does not exist.", "Make the share" + edit)};
    }
    if (!share->offeredToFtp) {
        return {keptOut("The " + which + " is not offered over FTP.",
                        "Write \"ftp\": true into the share" + edit)};
    }
    const auto grant = grantTo({account, user->uid, groupsOf(*user)}, *share);
    if (grant.value_or(Access::none) == Access::none) {
        return {keptOut("The " + which + " is closed to their account ftp.",
                        "Write \"ftp\": \"read\" into the users of the share" + edit)};
    }
    const auto found = judgeFolder(*share, which);
    return found ? Findings{*found} : Findings();
}

} // namespace velt
