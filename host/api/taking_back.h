// What is left to take back of a change that nobody confirmed, after those that came later.
#ifndef VELT_HOST_API_TAKING_BACK_H
#define VELT_HOST_API_TAKING_BACK_H

#include "standalone/standalone.h"

#include <json/value.h>

#include <string>
#include <vector>

namespace velt::host {

struct TakingBack {
    Json::Value wanted; ///< the settings document afterwards
    bool any = false;   ///< whether a field gets its former value; else `wanted` is what is in force

    /// Fields that were changed again since, for good or by somebody else than this system.
    std::vector<std::string> kept;

    /// Later changes of the same fields that wait for a confirmation as well, as they are to be recorded from
    /// now on: taken back themselves, they give the value from before both.
    std::vector<ChangeRecord> rebased;
};

/// Takes the change back field by field. `later`: the changes after it, newest first. What was changed again
/// to the same value was changed again all the same: whoever did that wants it.
TakingBack takingBack(const ChangeRecord& change, const std::vector<ChangeRecord>& later,
                      const Json::Value& current);

/// The field as it is written today: the accounts of its rules may have come or gone since the change.
Json::Value withNamesOfNow(Json::Value field);

/// The change that this one undid; 0 when it undid none.
std::int64_t undoneBy(const ChangeRecord& change);

} // namespace velt::host

#endif
