#include "standalone/daemons/daemon_plan.h"

#include <system_error>

namespace velt {

void removeFormerPlans(const DaemonPlan& plan) {
    if (plan.folder.empty()) {
        return;
    }
    // What cannot be removed takes a little room until the next time, no more.
    std::error_code ignored;
    for (std::filesystem::directory_iterator entry(plan.folder.parent_path(), ignored), end;
         !ignored && entry != end; entry.increment(ignored)) {
        if (entry->path() != plan.folder) {
            std::error_code stays;
            std::filesystem::remove_all(entry->path(), stays);
        }
    }
}

} // namespace velt
