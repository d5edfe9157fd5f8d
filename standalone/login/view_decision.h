// What one login may see.
#ifndef VELT_STANDALONE_LOGIN_VIEW_DECISION_H
#define VELT_STANDALONE_LOGIN_VIEW_DECISION_H

#include "base/result.h"
#include "standalone/login/grants.h"
#include "standalone/login/view.h"
#include "standalone/rules/chroot_rule.h"
#include "standalone/shares/access.h"

#include <filesystem>
#include <optional>
#include <string>
#include <vector>

namespace velt {

/// What a login sees when no chroot rule applies to it.
enum class DefaultView {
    home,      ///< the user's home
    shares,    ///< the shares side by side
    anonymous, ///< the share that anonymousShare names, else the shares side by side; rules never apply
    server,    ///< everything, with the rights that the daemon has; a login with a rule is refused
    stored,    ///< what storedDefaultView says at the login
};

/// A login, as the daemon describes it.
struct Login {
    DefaultView view = DefaultView::home;
    Identity user;
    std::string home;
    std::filesystem::path anonymousShare; ///< a file that holds the name of a share; "": all shares
};

/// home or shares, as the stored settings of FTP have it.
Result<DefaultView> storedDefaultView();

/// The stored shares; none without the file. An error when somebody else could have written it.
Result<std::vector<ShareEntry>> readSharesOfLogins();

/// The stored rules. An error when their file is missing, too: somebody may have removed it to get rid of the
/// rules.
Result<std::vector<ChrootRule>> readRulesOfLogins();

/// The rule that the login follows, if any.
std::optional<ChrootRule> ruleOf(const Login& login, const std::vector<ChrootRule>& rules);

/// Tells `view` what the login sees: the folder of the rule, else the default view, with the access that the
/// shares grant. Returns one sentence for each share that is left out or gives less than it grants. An error
/// when the login is to be refused.
Result<std::vector<std::string>> decideView(const Login& login, const std::optional<ChrootRule>& rule,
                                            const std::vector<ShareEntry>& shares, const Grants& grants,
                                            View& view);

} // namespace velt

#endif
