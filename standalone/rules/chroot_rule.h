// A chroot rule and its line form.
#ifndef VELT_STANDALONE_RULES_CHROOT_RULE_H
#define VELT_STANDALONE_RULES_CHROOT_RULE_H

#include "base/result.h"

#include <sys/types.h>

#include <string>
#include <string_view>
#include <vector>

namespace velt {

/// Confines the FTP logins of a user or of a group's members to a folder.
struct ChrootRule {
    bool isUser = false;
    unsigned id = 0;  ///< uid or gid
    std::string path; ///< see isRulePath

    bool operator==(const ChrootRule&) const = default;
};

/// The path that means each user's own home.
inline constexpr std::string_view homePath = "/home";

/// The longest line of a rule, in bytes.
inline constexpr std::size_t longestRule = 2047;

/// Whether a rule can have this path: "/home", or "/" and a share's name, perhaps with folders below it;
/// without empty components, ".", ".." and control characters.
bool isRulePath(std::string_view path);

/// The rule for the user or group with this number. Slashes at the end of the path are dropped.
Result<ChrootRule> makeRule(bool isUser, int id, std::string path);

/// "u:1000:/share/below" for a user's rule, "g:100:/home" for a group's.
std::string formatRule(const ChrootRule& rule);

/// Reads what formatRule makes, and nothing else. The error's message is a part of a sentence.
Result<ChrootRule> parseRule(std::string_view line);

/// The name of the user or group that the rule is for. An error when no account has the number.
Result<std::string> ownerOf(const ChrootRule& rule);

/// The rule that a login follows: the user's first one, else the first one of a group with these numbers.
/// Null when there is none.
const ChrootRule* ruleFor(const std::vector<ChrootRule>& rules, uid_t uid, const std::vector<gid_t>& gids);

} // namespace velt

#endif
