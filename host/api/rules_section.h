// The chroot rules of the settings document: those that the module names, and in their places those of
// accounts that have no name now, as "#4711", so that an edit of the others loses none.
#ifndef VELT_HOST_API_RULES_SECTION_H
#define VELT_HOST_API_RULES_SECTION_H

#include "base/result.h"

#include <json/value.h>

#include <optional>

namespace velt::host {

/// All stored rules, when these are the ones that the module names: {"type", "name", "path"} each. Nothing
/// when the accounts changed while they were asked for: ask the module again.
Result<std::optional<Json::Value>> allRules(const Json::Value& named);

/// Whether the rule is for an account without a name.
bool isUnnamed(const Json::Value& rule);

/// The document, in which rules of accounts that have a name again have that name, as stored ones do.
Json::Value withNames(Json::Value document);

/// The others, for the module.
Json::Value namedRules(const Json::Value& rules);

/// Puts the rules of accounts without names back where the module left them out.
Result<> storeUnnamedRules(const Json::Value& rules);

} // namespace velt::host

#endif
