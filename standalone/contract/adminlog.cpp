#include "platform/adminlog.h"

#include "standalone/contract/boundary.h"
#include "standalone/journal/admin_log.h"

int VELTLogSet1(int category, int level, unsigned event, const char* arg1, const char* arg2, const char* arg3,
                const char* arg4) {
    return velt::atBoundary([&] { return velt::logEvent(category, level, event, {arg1, arg2, arg3, arg4}); });
}
