#include "standalone/login/login_view.h"

#include "base/file.h"
#include "standalone/core/error_number.h"
#include "standalone/login/shown_facts.h"
#include "standalone/login/view_mounts.h"

#include <unistd.h>

namespace velt {
namespace {

/// Mounts at a folder.
class MountedView : public View {
public:
    /// Adds what it shows to the facts, which outlive it, as do the rules of all.
    MountedView(const std::filesystem::path& root, const std::vector<ChrootRule>& rules, ShownFacts& facts)
        : root_(root), rules_(rules), facts_(facts), shares_(root) {}

    Result<> showHome(VisibleFolder home) override { return showAll(home); }
    Result<> showInShare(const ShareEntry& /*share*/, VisibleFolder folder) override {
        return showAll(folder);
    }
    Result<> beginShares() override { return shares_.begin(); }
    Result<> addShare(const ShareEntry& share, VisibleFolder folder) override {
        VELT_RETURN_IF_ERROR(tell("/" + share.name, folder));
        return shares_.add(share.name, folder);
    }
    void leaveOut(const ShareEntry& /*share*/) override {}
    Result<> finishShares() override { return shares_.finish(); }

private:
    Result<> tell(const std::string& path, const VisibleFolder& folder) {
        facts_.add(path, folder.folder);
        return folder.access == Access::write ? facts_.addRuleFolders(rules_, folder.folder) : Result<>();
    }
    Result<> showAll(const VisibleFolder& folder) {
        VELT_RETURN_IF_ERROR(tell("/", folder));
        return showFolder(root_, folder);
    }

    const std::filesystem::path& root_;
    const std::vector<ChrootRule>& rules_;
    ShownFacts& facts_;
    SideBySide shares_;
};

} // namespace

Result<std::vector<std::string>> makeLoginView(Login login, const std::filesystem::path& root) {
    if (login.view == DefaultView::stored) {
        VELT_ASSIGN_OR_RETURN(login.view, storedDefaultView());
    }
    VELT_ASSIGN_OR_RETURN(const auto rules, readRulesOfLogins());
    const auto rule = ruleOf(login, rules);
    if (login.view == DefaultView::server) {
        return rule ? Result<std::vector<std::string>>(
                          Error(ErrorNumber::invalid, "Without root's rights a login cannot be confined."))
                    : std::vector<std::string>();
    }
    VELT_ASSIGN_OR_RETURN(const auto shares, readSharesOfLogins());
    VELT_RETURN_IF_ERROR(isolateMounts());
    const Grants grants(login.user, shares);
    ShownFacts facts(grants);
    MountedView view(root, rules, facts);
    auto decided = decideView(login, rule, shares, grants, view);
    if (!decided || writeAll(STDOUT_FILENO, facts.text()) || !facts.isNeeded()) {
        return decided; // without them the session cannot say which files it changed, but it may log in
    }
    return Error(ErrorNumber::daemon, "The session cannot be told which folders rules lead to.");
}

} // namespace velt
