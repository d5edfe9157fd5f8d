// Whether services are switched on, as opposed to whether they run now.
#ifndef VELT_CLI_WANTED_SERVICES_H
#define VELT_CLI_WANTED_SERVICES_H

#include "cli/setting.h"

#include <string>
#include <vector>

namespace velt::cli {

struct StoredSwitches {
    Json::Value values;              ///< the current values, with the switches as they are stored
    std::vector<std::string> doubts; ///< a sentence for each switch of which that is not known
};

/// A switch that is read as off may belong to a service that is just down, and sending "off" with a change of
/// something else would switch it off for good. So the stored switches are asked for, unless `wanted` names
/// them all. A server that does not tell leaves a doubt for each switch that is read as off.
StoredSwitches readStoredSwitches(ApiClient& api, const SettingGroup& group, const Json::Value& wanted,
                                  const Json::Value& current);

} // namespace velt::cli

#endif
