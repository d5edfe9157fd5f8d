// One call of a module's entry function, and its outcome.
#ifndef VELT_HOST_MODULE_MODULE_CALL_H
#define VELT_HOST_MODULE_MODULE_CALL_H

#include "host/module/module_table.h"
#include "host/module/platform_request.h"

#include <json/value.h>

#include <string>
#include <vector>

namespace velt::host {

struct Outcome {
    enum class Kind {
        success, ///< `data` is the value, null for none
        refused, ///< `code` is the module's number
        broken,  ///< the module broke its contract: `defect` says how
    };
    Kind kind = Kind::broken;
    int code = 0;
    Json::Value data;
    std::string defect;
    std::vector<std::string> logLines;
    PlatformReport platform; ///< of a failure
    bool takenBack = false;  ///< it succeeded, and what it asked for could not be done
    double seconds = 0;
};

/// Calls the row's entry function on this thread, on behalf of the actor. Catches everything that the module
/// throws.
Outcome callRow(const Row& row, const Json::Value& parameters, const std::string& actor,
                const std::string& address);

} // namespace velt::host

#endif
