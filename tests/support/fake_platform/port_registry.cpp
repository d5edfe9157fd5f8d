// The web API framework's port registry.

#include "platform/webapi.h"
#include "tests/support/fake_platform/fake_platform.h"
#include "tests/support/fake_platform/text.h"

using fake::arguments;
using fake::Platform;

namespace {

bool isStoredByAnother(const std::string& service, int first, int last) {
    for (const auto& [owner, ranges] : Platform::instance().storedPorts) {
        for (const VELT_FTP_PORT_RANGE& range : ranges) {
            if (owner != service && first <= range.last && range.first <= last) {
                return true;
            }
        }
    }
    return false;
}

} // namespace

int WebUtils::IsPortConflict(const char* service, int firstPort, int lastPort) {
    auto& platform = Platform::instance();
    const auto shown = arguments(service, firstPort, lastPort);
    if (const auto failure = platform.enter("WebUtils::IsPortConflict", shown)) {
        return *failure;
    }
    if (isStoredByAnother(service, firstPort, lastPort)) {
        return 1;
    }
    for (const auto& [owner, ports] : platform.takenPorts) {
        const auto port = ports.lower_bound(firstPort);
        if (owner != service && port != ports.end() && *port <= lastPort) {
            return 1;
        }
    }
    return 0;
}
