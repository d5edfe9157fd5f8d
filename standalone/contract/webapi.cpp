#include "platform/webapi.h"

#include "standalone/contract/boundary.h"
#include "standalone/contract/last_port_conflict.h"

namespace velt {
namespace {

thread_local PortConflict lastConflict;

Result<> expectNoConflict(const char* service, int firstPort, int lastPort) {
    lastConflict = {};
    VELT_ASSIGN_OR_RETURN(auto found,
                          findPortConflict(service == nullptr ? "" : service, firstPort, lastPort));
    if (!found) {
        return {};
    }
    lastConflict = std::move(*found);
    return Error(ErrorNumber::portTaken, lastConflict.sentence);
}

} // namespace

PortConflict lastPortConflict() {
    return lastConflict;
}

} // namespace velt

namespace WebUtils {

int IsPortConflict(const char* service, int firstPort, int lastPort) {
    const int result = velt::atBoundary([&] { return velt::expectNoConflict(service, firstPort, lastPort); });
    return result < 0 ? 1 : 0;
}

} // namespace WebUtils
