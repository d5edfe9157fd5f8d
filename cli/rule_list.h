// Chroot rules: who is confined to which folder over FTP.
#ifndef VELT_CLI_RULE_LIST_H
#define VELT_CLI_RULE_LIST_H

#include "cli/api_client.h"

#include <optional>
#include <string>
#include <vector>

namespace velt::cli {

struct ChrootRule {
    std::string type; ///< "user" or "group"
    std::string name;
    std::string path; ///< "/share", "/share/folder" or "/home"

    bool operator==(const ChrootRule&) const = default;
};

using ChrootRules = std::vector<ChrootRule>;

/// As "user NAME PATH".
std::string ruleToText(const ChrootRule& rule);

Json::Value rulesToJson(const ChrootRules& rules);

/// What is wrong with a rule, in words.
std::optional<std::string> faultOf(const ChrootRule& rule);

/// The rules of a list of objects; keys other than "type", "name" and "path" are ignored. Each fault of the
/// array is added to `faults`, in words.
ChrootRules rulesFromJson(const Json::Value& array, std::vector<std::string>& faults);

/// What the server has stored.
ChrootRules loadRules(ApiClient& api);

/// Stores the rules in place of all stored ones, which are `before`, and loads them again, since the server
/// leaves out rules that it does not accept. Then `before` is stored again, and Failure (refused) names the
/// rules that were left out.
void storeRules(ApiClient& api, const ChrootRules& rules, const ChrootRules& before);

} // namespace velt::cli

#endif
