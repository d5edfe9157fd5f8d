// One JSON document with all settings, and how to apply it to a server.
#ifndef VELT_CLI_SETTINGS_DOCUMENT_H
#define VELT_CLI_SETTINGS_DOCUMENT_H

#include "cli/rule_list.h"

namespace velt::cli {

/// All settings of a server: "format", "format_version", "chroot_rules", "security", "ftp", "sftp". A service
/// that is switched on but down is written as on.
Json::Value exportSettings(ApiClient& api);

/// Every fault of a document, in words; a document without faults can be imported. Sections and keys may be
/// missing, but not unknown.
std::vector<std::string> documentFaults(const Json::Value& document);

/// What one section of a document changes.
struct ImportStep {
    std::string section;
    std::vector<std::string> changes; ///< for people, printable
    Json::Value changesJson{Json::arrayValue};
    std::function<void()> apply;
};

struct ImportPlan {
    /// Confinement first, services last: nothing opens before its limits are in force.
    std::vector<ImportStep> steps;
};

/// Compares a document without faults with the server. Nothing is changed before the steps are applied; `api`
/// outlives them.
ImportPlan planImport(ApiClient& api, const Json::Value& document);

} // namespace velt::cli

#endif
