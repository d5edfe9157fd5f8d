#include "standalone/login/login_view.h"

#include "base/trusted_file.h"
#include "standalone/core/error_number.h"
#include "standalone/core/paths.h"
#include "standalone/core/state_root.h"
#include "standalone/login/grants.h"
#include "standalone/login/open_folder.h"
#include "standalone/login/view_mounts.h"
#include "standalone/rules/rule_store.h"
#include "standalone/shares/share_file.h"

#include <strings.h>

#include <algorithm>
#include <optional>

namespace velt {
namespace {

Error refuse(std::string why, SourcePlace where = SourcePlace::current()) {
    return {ErrorNumber::invalid, std::move(why), where};
}

// Without the file there are no shares. A missing file of rules is an error: somebody may have removed it to
// get rid of the rules.
Result<std::vector<ShareEntry>> readShares() {
    const auto path = statePath(paths::shares);
    std::error_code error;
    if (std::filesystem::symlink_status(path, error).type() == std::filesystem::file_type::not_found) {
        return std::vector<ShareEntry>();
    }
    VELT_ASSIGN_OR_RETURN(const auto text, readTrusted(path));
    return parseShares(text);
}

/// The path of the rule that the user follows, if any.
Result<std::optional<std::string>> readRule(const Identity& user) {
    VELT_ASSIGN_OR_RETURN(const auto text, readTrusted(statePath(paths::chrootRules)));
    VELT_ASSIGN_OR_RETURN(const auto rules, parseRules(text));
    const ChrootRule* const rule = ruleFor(rules, user.uid, user.gids);
    return rule != nullptr ? std::optional(rule->path) : std::nullopt;
}

// In its root directory the daemon's module lets nobody change these folders, see own_files.h.
bool isKeptInRoot(const std::string& share) {
    return strcasecmp(share.c_str(), "etc") == 0 || strcasecmp(share.c_str(), "lib") == 0;
}

class ViewMaker {
public:
    ViewMaker(const Login& login, const std::filesystem::path& root, const std::vector<ShareEntry>& shares)
        : login_(login), root_(root), shares_(shares), grants_(login.user, shares) {
        remarks = grants_.remarks();
        for (const std::string& share : grants_.missing()) {
            remarks.push_back("The folder of the share " + share +
                              " is missing; until it is back, nobody writes to the shares around it.");
        }
    }

    Result<> showHome();
    /// Shows the folder "/share/below/it".
    Result<> showInShare(const std::string& path);
    Result<> showShares();
    Result<> showToAnonymous();

    /// An error when nothing may be shown.
    const Result<>& looked() const { return grants_.looked(); }

    std::vector<std::string> remarks;

private:
    /// The folder with this access, and what the shares in it need.
    VisibleFolder visible(OpenedFolder folder, Access access);
    /// Shows the folder with this access, limited by the shares between it and `outer`.
    Result<> showOne(OpenedFolder folder, const std::filesystem::path& outer, Access access);
    Result<> addShare(SideBySide& view, const ShareEntry& share, Access access);

    const Login& login_;
    const std::filesystem::path& root_;
    const std::vector<ShareEntry>& shares_;
    Grants grants_;
};

VisibleFolder ViewMaker::visible(OpenedFolder folder, Access access) {
    return {std::move(folder.fd), access, grants_.restrictionsBelow(folder.place, access)};
}

Result<> ViewMaker::showOne(OpenedFolder folder, const std::filesystem::path& outer, Access access) {
    access = grants_.leastAt(folder.place, outer, access);
    if (access == Access::none) {
        return refuse("The shares grant the user no access to " + folder.place.string() + ".");
    }
    return showFolder(root_, visible(std::move(folder), access));
}

Result<> ViewMaker::showHome() {
    VELT_ASSIGN_OR_RETURN(auto home, openFolderAs(login_.user, login_.home));
    // Shares around the home do not count, since it is the user's own; a share that is the home does.
    const auto outer = home.place.parent_path();
    return showOne(std::move(home), outer, Access::write);
}

Result<> ViewMaker::showInShare(const std::string& path) {
    const auto end = std::min(path.find('/', 1), path.size());
    const auto share = std::ranges::find(shares_, path.substr(1, end - 1), &ShareEntry::name);
    if (share == shares_.end()) {
        return refuse("There is no share for the path " + path + ".");
    }
    const Access access = grants_.on(*share);
    if (access == Access::none) {
        return refuse("The share " + share->name + " grants the user no access.");
    }
    VELT_ASSIGN_OR_RETURN(auto folder, openFolderAs(login_.user, share->path));
    const auto outer = folder.place;
    if (end < path.size()) {
        VELT_ASSIGN_OR_RETURN(folder, openFolderBelow(login_.user, folder.fd, path.substr(end + 1)));
    }
    return showOne(std::move(folder), outer, access);
}

Result<> ViewMaker::addShare(SideBySide& view, const ShareEntry& share, Access access) {
    VELT_ASSIGN_OR_RETURN(auto folder, openFolderAs(login_.user, share.path));
    if (isKeptInRoot(share.name) && access == Access::write) {
        remarks.push_back("The share " + share.name +
                          " is read-only over FTP, since system folders have this name.");
        access = Access::read;
    }
    return view.add(share.name, visible(std::move(folder), access));
}

Result<> ViewMaker::showShares() {
    SideBySide view(root_);
    VELT_RETURN_IF_ERROR(view.begin());
    for (const ShareEntry& share : shares_) {
        const Access access = share.offeredToFtp ? grants_.on(share) : Access::none;
        if (access == Access::none) {
            continue;
        }
        if (const Result<> added = addShare(view, share, access); !added) {
            remarks.push_back("The share " + share.name + " is left out: " + added.error().message);
        }
    }
    return view.finish();
}

Result<> ViewMaker::showToAnonymous() {
    if (login_.anonymousShare.empty()) {
        return showShares();
    }
    VELT_ASSIGN_OR_RETURN(const auto name, readTrusted(login_.anonymousShare));
    const auto share = std::ranges::find(shares_, name, &ShareEntry::name);
    if (share == shares_.end() || !share->offeredToFtp) {
        return refuse("The share for anonymous users does not exist, or is not offered to FTP.");
    }
    return showInShare("/" + name);
}

Result<> show(ViewMaker& maker, DefaultView view, const std::optional<std::string>& rule) {
    if (view == DefaultView::anonymous) {
        return maker.showToAnonymous();
    }
    if (rule && *rule != homePath) {
        return maker.showInShare(*rule);
    }
    return !rule && view == DefaultView::shares ? maker.showShares() : maker.showHome();
}

} // namespace

Result<std::vector<std::string>> makeLoginView(const Login& login, const std::filesystem::path& root) {
    std::optional<std::string> rule;
    if (login.view != DefaultView::anonymous) {
        VELT_ASSIGN_OR_RETURN(rule, readRule(login.user));
    }
    if (login.view == DefaultView::server) {
        return rule ? Result<std::vector<std::string>>(
                          refuse("Without root's rights a login cannot be confined."))
                    : std::vector<std::string>();
    }
    VELT_ASSIGN_OR_RETURN(const auto shares, readShares());
    VELT_RETURN_IF_ERROR(isolateMounts());
    ViewMaker maker(login, root, shares);
    VELT_RETURN_IF_ERROR(maker.looked());
    VELT_RETURN_IF_ERROR(show(maker, login.view, rule));
    return std::move(maker.remarks);
}

} // namespace velt
