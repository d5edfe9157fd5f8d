// The stored chroot rules: "/etc/velt/chroot_rules" below the state root, a version line and then one rule a
// line.
#ifndef VELT_STANDALONE_RULES_RULE_STORE_H
#define VELT_STANDALONE_RULES_RULE_STORE_H

#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace velt {

/// Confines the FTP logins of a user or of a group's members to a folder. The FTP daemon applies, at each
/// login, the first rule of the user, else the first one of a group of the user's, else the general setting.
struct ChrootRule {
    bool isUser = false;
    unsigned id = 0;  ///< uid or gid
    std::string path; ///< see isRulePath

    bool operator==(const ChrootRule&) const = default;
};

/// The folder that stands for each user's own home.
inline constexpr std::string_view homePath = "/home";

/// The longest line of a rule, in bytes.
inline constexpr std::size_t longestRule = 2047;

/// Whether a rule can have this path: "/home", or a share's name and perhaps folders below it, without empty
/// components, "." and "..", and without control characters.
bool isRulePath(std::string_view path);

/// "u:1000:/share/below" for a user's rule, "g:100:/home" for a group's.
std::string formatRule(const ChrootRule& rule);

/// Reads what formatRule makes; nothing when the line is something else.
std::optional<ChrootRule> parseRule(std::string_view line);

/// Reads the text of the rules file. Nothing, with the last error naming the file and the line, when it is
/// damaged.
std::optional<std::vector<ChrootRule>> parseRules(std::string_view text);

/// The stored rules in stored order; none when nothing was stored yet. Nothing, with the last error naming
/// the file and the line, when it cannot be read or is damaged.
std::optional<std::vector<ChrootRule>> loadRules();

/// Stores these rules in place of the stored ones; logins from now on follow them. Whoever changes what
/// loadRules() returned holds a StateLock from before that call until after this one. Negative on failure,
/// with the last error set and the stored rules as they were.
int saveRules(const std::vector<ChrootRule>& rules);

/// Stores an empty set where nothing was stored yet: without the file the FTP daemon refuses each login.
/// Negative on failure, with the last error set.
int makeRulesFile();

} // namespace velt

#endif
