// What a request does to the platform while a thread serves it.
#ifndef VELT_HOST_MODULE_PLATFORM_REQUEST_H
#define VELT_HOST_MODULE_PLATFORM_REQUEST_H

#include "standalone/standalone.h"

#include <string>
#include <vector>

namespace velt::host {

struct PlatformReport {
    bool changed = false;                  ///< something was stored, started or stopped
    bool stored = false;                   ///< something was stored
    bool storeFailed = false;              ///< something could not be stored
    std::vector<std::string> started;      ///< the services that were started
    std::string sentence;                  ///< of the last error; "" when there was none
    PortConflict conflict;                 ///< the port that was found taken
    std::vector<ServiceSessions> sessions; ///< of the services that were replaced or stopped
};

/// The request that this thread serves, from its construction to finish(). Stays on its thread.
class PlatformRequest {
public:
    PlatformRequest(const std::string& actor, const std::string& address);
    ~PlatformRequest();
    PlatformRequest(const PlatformRequest&) = delete;
    PlatformRequest& operator=(const PlatformRequest&) = delete;

    /// Ends the request and tells what it did. Call it once.
    PlatformReport finish();

private:
    void note(Effect effect, std::string_view subject, bool done);

    PlatformReport report_;
    ServiceRequest services_;
};

} // namespace velt::host

#endif
