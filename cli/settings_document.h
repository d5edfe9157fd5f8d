// One JSON document with all settings, and what it takes to bring a server to its state.
#ifndef VELT_CLI_SETTINGS_DOCUMENT_H
#define VELT_CLI_SETTINGS_DOCUMENT_H

#include "cli/rule_list.h"

namespace velt::cli {

/// The whole of a server's settings, services that are switched on and down as switched on: "format",
/// "format_version", "chroot_rules", "security", "ftp", "sftp".
Json::Value exportSettings(ApiClient& api);

/// Every fault of a document, in words; none: it can be imported. Sections and keys may be absent, but none
/// may be unknown.
std::vector<std::string> documentFaults(const Json::Value& document);

/// What one section of a document changes.
struct ImportStep {
    std::string section;
    std::vector<std::string> changes; ///< for people, printable
    Json::Value changesJson{Json::arrayValue};
    std::function<void()> apply;
};

struct ImportPlan {
    /// Confinement first, the services last: nothing opens before its limits are in force.
    std::vector<ImportStep> steps;
};

/// Compares a document without faults with the server. Nothing is changed before the steps are applied; `api`
/// outlives them.
ImportPlan planImport(ApiClient& api, const Json::Value& document);

} // namespace velt::cli

#endif
