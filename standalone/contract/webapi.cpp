#include "platform/webapi.h"

#include "standalone/control/port_conflict.h"
#include "standalone/core/boundary.h"

namespace WebUtils {

int IsPortConflict(const char* service, int firstPort, int lastPort) {
    const int result = velt::atBoundary(
        [&] { return velt::findPortConflict(service == nullptr ? "" : service, firstPort, lastPort); });
    return result < 0 ? 1 : 0;
}

} // namespace WebUtils
