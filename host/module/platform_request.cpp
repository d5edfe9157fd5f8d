#include "host/module/platform_request.h"

namespace velt::host {

PlatformRequest::PlatformRequest(const std::string& actor, const std::string& address)
    : outer_(requestActor()) {
    clearLastError();
    setRequestActor(actor, address);
}

PlatformRequest::~PlatformRequest() {
    setRequestActor(outer_.actor, outer_.address);
}

PlatformReport PlatformRequest::report() {
    return {lastErrorSentence(), lastErrorNumber(), lastPortConflict()};
}

} // namespace velt::host
