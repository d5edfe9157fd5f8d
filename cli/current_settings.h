// The settings that a server has.
#ifndef VELT_CLI_CURRENT_SETTINGS_H
#define VELT_CLI_CURRENT_SETTINGS_H

#include "cli/api_client.h"
#include "cli/setting.h"

#include <string>
#include <vector>

namespace velt::cli {

struct CurrentSettings {
    Json::Value shown;  ///< what the server's "get" answers: the switch of a service that is down may be off
    Json::Value stored; ///< the same with each switch as it is stored, so that it can be sent back
    std::vector<std::string>
        doubts; ///< a sentence for each switch that is shown as off and whose stored state is unknown
};

/// What a "get" answers: an object. Failure when it is not an object or lacks a required key.
Json::Value readSettings(ApiClient& api, const SettingGroup& group);

/// The settings before a change of what `wanted` names. The switches that it names are not looked up: they
/// are not sent back.
CurrentSettings readCurrentSettings(ApiClient& api, const SettingGroup& group,
                                    const Json::Value& wanted = Json::objectValue);

} // namespace velt::cli

#endif
