// All settings as one JSON document, and what a change of it means.
#ifndef VELT_HOST_API_SETTINGS_DOCUMENT_H
#define VELT_HOST_API_SETTINGS_DOCUMENT_H

#include "base/result.h"
#include "host/http/message.h"
#include "host/module/module_table.h"
#include "schema/settings_table.h"
#include "standalone/standalone.h"

#include <json/value.h>

#include <string>
#include <string_view>
#include <vector>

namespace velt::host {

inline constexpr std::string_view rulesSection = "chroot_rules";

/// One field that has another value than before.
struct FieldChange {
    std::string field; ///< a JSON Pointer (RFC 6901): "/ftp/portnum", "/chroot_rules"
    Json::Value from;
    Json::Value to;

    bool operator==(const FieldChange&) const = default;
};

/// The settings of a group that the document shows: those of the newest version of its API.
std::vector<const schema::Setting*> documentSettings(const schema::SettingGroup& group);

/// What is stored, for the calling thread: {"format", "format_version", "chroot_rules", "confinement", "ftp",
/// "security", "sftp"}. A service that is on but down is on. A section whose module is not loaded is missing.
/// Call it as a read.
Result<Json::Value> readSettingsDocument(const ModuleTable& table, const Principal& principal);

/// In the order of the document. A passive range that is switched off before and after is no difference: it
/// is a default that nobody has set.
std::vector<FieldChange> differences(const Json::Value& before, const Json::Value& after);

/// {"field", "from", "to"}
Json::Value toObject(const FieldChange& change);

/// The ports that the document gives to the daemons.
IntendedPorts portsIn(const Json::Value& document);

/// One call of a module: the newest `method` of the section's API.
struct SettingsCall {
    std::string section; ///< "ftp"
    std::string api;
    int version = 0;
    std::string method;
    Json::Value parameters;
};

/// Stores what is the platform's own of the wanted document, where it differs. `wanted` passed checkSettings.
Result<> storePlatformSettings(const Json::Value& before, const Json::Value& wanted);

/// The calls of modules that lead from the one document to the other: confinement first, services last.
/// `wanted` passed checkSettings.
std::vector<SettingsCall> callsFor(const Json::Value& before, const Json::Value& wanted);

} // namespace velt::host

#endif
