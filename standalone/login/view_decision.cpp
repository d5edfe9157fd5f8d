#include "standalone/login/view_decision.h"

#include "base/trusted_file.h"
#include "standalone/core/error_number.h"
#include "standalone/core/paths.h"
#include "standalone/core/state_root.h"
#include "standalone/login/open_folder.h"
#include "standalone/rules/rule_store.h"
#include "standalone/settings/settings_store.h"
#include "standalone/shares/share_file.h"

#include <strings.h>

#include <algorithm>

namespace velt {
namespace {

Error refuse(std::string why, SourcePlace where = SourcePlace::current()) {
    return {ErrorNumber::invalid, std::move(why), where};
}

// In its root directory the daemon's module lets nobody change these folders, see own_files.h.
bool isKeptInRoot(const std::string& share) {
    return strcasecmp(share.c_str(), "etc") == 0 || strcasecmp(share.c_str(), "lib") == 0;
}

class ViewMaker {
public:
    ViewMaker(const Login& login, const std::vector<ShareEntry>& shares, const Grants& grants, View& view)
        : login_(login), shares_(shares), grants_(grants), view_(view) {
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

    std::vector<std::string> remarks;

private:
    /// The folder with this access, and what the shares in it need.
    VisibleFolder visible(OpenedFolder folder, Access access);
    /// The folder with this access, limited by the shares between it and `outer`.
    Result<VisibleFolder> limited(OpenedFolder folder, const std::filesystem::path& outer, Access access);
    Result<> addShare(const ShareEntry& share, Access access);

    const Login& login_;
    const std::vector<ShareEntry>& shares_;
    const Grants& grants_;
    View& view_;
};

VisibleFolder ViewMaker::visible(OpenedFolder folder, Access access) {
    return {std::move(folder.fd), access, grants_.restrictionsBelow(folder.place, access)};
}

Result<VisibleFolder> ViewMaker::limited(OpenedFolder folder, const std::filesystem::path& outer,
                                         Access access) {
    access = grants_.leastAt(folder.place, outer, access);
    if (access == Access::none) {
        return refuse("The shares grant the user no access to " + folder.place.string() + ".");
    }
    return visible(std::move(folder), access);
}

Result<> ViewMaker::showHome() {
    VELT_ASSIGN_OR_RETURN(auto home, openFolderAs(login_.user, login_.home));
    // Shares around the home do not count, since it is the user's own; a share that is the home does.
    const auto outer = home.place.parent_path();
    VELT_ASSIGN_OR_RETURN(auto folder, limited(std::move(home), outer, Access::write));
    return view_.showHome(std::move(folder));
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
    VELT_ASSIGN_OR_RETURN(auto shown, limited(std::move(folder), outer, access));
    return view_.showInShare(*share, std::move(shown));
}

Result<> ViewMaker::addShare(const ShareEntry& share, Access access) {
    VELT_ASSIGN_OR_RETURN(auto folder, openFolderAs(login_.user, share.path));
    if (isKeptInRoot(share.name) && access == Access::write) {
        remarks.push_back("The share " + share.name +
                          " is read-only in sessions, since system folders have this name.");
        access = Access::read;
    }
    return view_.addShare(share, visible(std::move(folder), access));
}

Result<> ViewMaker::showShares() {
    VELT_RETURN_IF_ERROR(view_.beginShares());
    for (const ShareEntry& share : shares_) {
        const Access access = share.offeredToFtp ? grants_.on(share) : Access::none;
        if (access == Access::none) {
            view_.leaveOut(share);
            continue;
        }
        if (const Result<> added = addShare(share, access); !added) {
            remarks.push_back("The share " + share.name + " is left out: " + added.error().message);
        }
    }
    return view_.finishShares();
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

Result<> show(ViewMaker& maker, DefaultView view, const std::optional<ChrootRule>& rule) {
    if (view == DefaultView::anonymous) {
        return maker.showToAnonymous();
    }
    if (rule && rule->path != homePath) {
        return maker.showInShare(rule->path);
    }
    return !rule && view == DefaultView::shares ? maker.showShares() : maker.showHome();
}

} // namespace

Result<DefaultView> storedDefaultView() {
    VELT_ASSIGN_OR_RETURN(const auto settings, loadFtpFile());
    return settings.record.user_chroot != 0 ? DefaultView::home : DefaultView::shares;
}

Result<std::vector<ShareEntry>> readSharesOfLogins() {
    const auto path = statePath(paths::shares);
    std::error_code error;
    if (std::filesystem::symlink_status(path, error).type() == std::filesystem::file_type::not_found) {
        return std::vector<ShareEntry>();
    }
    VELT_ASSIGN_OR_RETURN(const auto text, readTrusted(path));
    return parseShares(text);
}

Result<std::vector<ChrootRule>> readRulesOfLogins() {
    VELT_ASSIGN_OR_RETURN(const auto text, readTrusted(statePath(paths::chrootRules)));
    return parseRules(text);
}

std::optional<ChrootRule> ruleOf(const Login& login, const std::vector<ChrootRule>& rules) {
    const ChrootRule* const rule =
        login.view == DefaultView::anonymous ? nullptr : ruleFor(rules, login.user.uid, login.user.gids);
    return rule != nullptr ? std::optional(*rule) : std::nullopt;
}

Result<std::vector<std::string>> decideView(const Login& login, const std::optional<ChrootRule>& rule,
                                            const std::vector<ShareEntry>& shares, const Grants& grants,
                                            View& view) {
    ViewMaker maker(login, shares, grants, view);
    VELT_RETURN_IF_ERROR(grants.looked());
    VELT_RETURN_IF_ERROR(show(maker, login.view, rule));
    return std::move(maker.remarks);
}

} // namespace velt
