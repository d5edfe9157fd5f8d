// Whether services are switched on, as opposed to whether they run now.
#ifndef VELT_CLI_WANTED_SERVICES_H
#define VELT_CLI_WANTED_SERVICES_H

#include "cli/setting.h"

#include <string>
#include <vector>

namespace velt::cli {

struct StoredSwitches {
    Json::Value values;              ///< the current values, with the switches as they are stored
    std::vector<std::string> doubts; ///< a sentence for each switch whose stored state is not known
};

/// A switch that reads as off may belong to a service that is only down, and sending "off" along with another
/// change would switch it off for good. So this asks for the stored switches, unless `wanted` names them all.
/// When the server does not tell, each switch that reads as off is in doubt.
StoredSwitches readStoredSwitches(ApiClient& api, const SettingGroup& group, const Json::Value& wanted,
                                  const Json::Value& current);

} // namespace velt::cli

#endif
