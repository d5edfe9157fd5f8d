// On whose behalf a thread works for a while, and what the platform says of it.
#ifndef VELT_HOST_MODULE_PLATFORM_REQUEST_H
#define VELT_HOST_MODULE_PLATFORM_REQUEST_H

#include "standalone/standalone.h"

#include <string>

namespace velt::host {

/// Why something failed, as the platform noted it last.
struct PlatformReport {
    std::string sentence;                  ///< of the last error; "" when there was none
    ErrorNumber error = ErrorNumber::none; ///< its kind
    PortConflict conflict;                 ///< the port that was found taken
};

/// The thread's request, for its lifetime: log entries and events name its actor. Stays on its thread; may be
/// nested.
class PlatformRequest {
public:
    PlatformRequest(const std::string& actor, const std::string& address);
    ~PlatformRequest();
    PlatformRequest(const PlatformRequest&) = delete;
    PlatformRequest& operator=(const PlatformRequest&) = delete;

    /// What was noted since its construction.
    static PlatformReport report();

private:
    RequestActor outer_;
};

} // namespace velt::host

#endif
