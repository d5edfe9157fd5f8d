#include "standalone/login/view_report.h"

#include "standalone/login/open_folder.h"

extern "C" {
#include "standalone/login/own_names.h"
}

#include <algorithm>

namespace velt {
namespace {

bool isWithin(const std::filesystem::path& place, const std::filesystem::path& outer) {
    return std::mismatch(outer.begin(), outer.end(), place.begin(), place.end()).first == outer.end();
}

/// Writes down what is decided.
class ReportedView : public View {
public:
    ReportedView(const Login& login, const Grants& grants, ViewReport& report)
        : login_(login), grants_(grants), report_(report) {}

    Result<> showHome(VisibleFolder home) override { return add("/", std::move(home), {}); }
    Result<> showInShare(const ShareEntry& share, VisibleFolder folder) override {
        return add("/", std::move(folder), grants_.reasonsOn(login_.user, share));
    }
    Result<> beginShares() override { return {}; }
    Result<> addShare(const ShareEntry& share, VisibleFolder folder) override {
        return add("/" + share.name, std::move(folder), grants_.reasonsOn(login_.user, share));
    }
    void leaveOut(const ShareEntry& share) override {
        auto reasons = share.offeredToFtp
                           ? grants_.reasonsOn(login_.user, share)
                           : std::vector<std::string>{"The share " + share.name + " is not offered."};
        report_.unseen.push_back({share.name, std::move(reasons)});
    }
    Result<> finishShares() override { return {}; }

private:
    Result<> add(std::string path, VisibleFolder folder, std::vector<std::string> reasons) {
        VELT_ASSIGN_OR_RETURN(auto place, placeOf(folder.folder));
        // Those that only keep a folder where it is take nothing away.
        std::erase_if(folder.restrictions,
                      [&](const Restriction& one) { return one.access == folder.access; });
        report_.folders.push_back({std::move(path), std::move(place), folder.access, std::move(reasons),
                                   std::move(folder.restrictions)});
        return {};
    }

    const Login& login_;
    const Grants& grants_;
    ViewReport& report_;
};

std::string reasonOf(const Login& login, const std::optional<ChrootRule>& rule) {
    if (rule) {
        const auto owner = ownerOf(*rule);
        const std::string whom = owner ? *owner : std::to_string(rule->id);
        return "The chroot rule of the " + std::string(rule->isUser ? "user " : "group ") + whom +
               (rule->path == homePath ? " confines the login to the home."
                                       : " confines the login to " + rule->path + ".");
    }
    return login.view == DefaultView::home ? "No chroot rule applies, and users are confined to their homes."
           : login.view == DefaultView::shares
               ? "No chroot rule applies, and users are not confined: they see the shares."
               : "Nothing confines the login.";
}

Result<> report(const Login& login, ViewReport& result) {
    VELT_ASSIGN_OR_RETURN(const auto rules, readRulesOfLogins());
    const auto rule = ruleOf(login, rules);
    result.reasons.push_back(reasonOf(login, rule));
    if (login.view == DefaultView::server) {
        result.isWholeServer = !rule;
        result.refused = rule ? "Without root's rights a login cannot be confined." : "";
        return {};
    }
    VELT_ASSIGN_OR_RETURN(const auto shares, readSharesOfLogins());
    const Grants grants(login.user, shares);
    ReportedView view(login, grants, result);
    VELT_ASSIGN_OR_RETURN(result.remarks, decideView(login, rule, shares, grants, view));
    return {};
}

/// The least that rules and grants let the login do at this place of the folder.
Access accessWithin(const SeenFolder& seen, const std::filesystem::path& place) {
    Access access = seen.access;
    for (const Restriction& one : seen.within) {
        if (isWithin(place, seen.folder / one.place)) {
            access = std::min(access, one.access);
        }
    }
    return access;
}

SeenPath describe(const SeenFolder& seen, const PathRights& rights) {
    const auto below = rights.place.lexically_relative(seen.folder);
    const Access shown = accessWithin(seen, rights.place);
    SeenPath found{(below == "." ? std::filesystem::path(seen.path) : seen.path / below).string(),
                   std::min(shown, rights.access), rights.reason};
    if (shown < rights.access) {
        found.reason = shown == Access::none ? "A share in it is closed to the user."
                       : shown < seen.access ? "A share in it lets the user only read."
                                             : "It is shown for reading only.";
    }
    if (shown == Access::none) {
        found.path.clear();
    }
    return found;
}

/// Whether sessions keep the place from being changed, since programs may obey what is there.
bool isKept(const ViewReport& view, const std::filesystem::path& place) {
    if (view.home.empty() || !isWithin(place, view.home)) {
        return false;
    }
    const auto below = place.lexically_relative(view.home);
    return velt_is_own_name(below.begin()->c_str()) != 0;
}

SeenPath bestIn(const ViewReport& view, const PathRights& rights) {
    SeenPath best{"", Access::none, "It is in no folder that the login sees."};
    for (const SeenFolder& seen : view.folders) {
        if (!isWithin(rights.place, seen.folder)) {
            continue;
        }
        SeenPath found = describe(seen, rights);
        if (best.path.empty() || found.access > best.access) {
            best = std::move(found);
        }
    }
    return best;
}

} // namespace

ViewReport reportView(const Login& login) {
    ViewReport result;
    std::error_code none;
    result.home = login.home.empty() ? std::filesystem::path() : std::filesystem::canonical(login.home, none);
    if (const Result<> reported = report(login, result); !reported) {
        result.refused = reported.error().message;
        result.folders.clear();
    }
    return result;
}

SeenPath findInView(const ViewReport& view, const PathRights& rights) {
    if (!view.refused.empty()) {
        return {"", Access::none, "The login would be refused."};
    }
    if (view.isWholeServer) {
        return {rights.place.string(), rights.access, rights.reason};
    }
    SeenPath best = bestIn(view, rights);
    if (best.access == Access::write && isKept(view, rights.place)) {
        best.access = Access::read;
        best.reason = "Sessions may not change it: programs obey what begins with a dot in a home.";
    }
    return best;
}

} // namespace velt
