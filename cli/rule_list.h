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

Json::Value rulesToJson(const ChrootRules& rules);

/// What is wrong with a rule, in words.
std::optional<std::string> faultOf(const ChrootRule& rule);

/// The rules of a list of objects; keys other than "type", "name" and "path" are ignored. Each fault of the
/// array is added to `faults`, in words.
ChrootRules rulesFromJson(const Json::Value& array, std::vector<std::string>& faults);

/// The rules in the server's document of all settings. Failure when it has none.
ChrootRules rulesOf(const Json::Value& settings);

} // namespace velt::cli

#endif
