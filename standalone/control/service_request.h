// Where a request of a host begins and ends, so that a restart within one is a hand-over.
#ifndef VELT_STANDALONE_CONTROL_SERVICE_REQUEST_H
#define VELT_STANDALONE_CONTROL_SERVICE_REQUEST_H

#include "base/result.h"

#include <string>
#include <vector>

namespace velt {

/// Which sessions end when a service goes on with other settings.
enum class SessionPolicy {
    byChange, ///< all of the service if the change takes away what one of them may do, else none
    keep,     ///< none
    end,      ///< all of the service, also if its settings did not change
};

/// What became of the sessions of a service, logged in or not.
struct ServiceSessions {
    std::string service; ///< "ftp" or "sftp"
    int ended = 0;
    int kept = 0; ///< they go on with the settings they began with
    bool operator==(const ServiceSessions&) const = default;
};

/// A request, from its beginning to its end. While there is one, what this thread asks of the contract has a
/// meaning that it cannot have call by call: a stop or pause of a service that is on by the stored settings
/// waits, and a start of it that follows is a hand-over. The new daemon listens before the old one ends; if
/// it does not come up, the old one serves on. A stop that no start followed is done at the end of the
/// request, so what is off after a request accepts nobody. If the process is killed before that, the next
/// startEnabledServices makes the services follow the stored settings. Stays on its thread. One within
/// another is a part of it.
class ServiceRequest {
public:
    explicit ServiceRequest(SessionPolicy policy = SessionPolicy::byChange);

    /// Ends it if finish() did not, after an exception for example. What fails goes to syslog.
    ~ServiceRequest();
    ServiceRequest(const ServiceRequest&) = delete;
    ServiceRequest& operator=(const ServiceRequest&) = delete;

    /// Ends the request: does what still waits, and tells what became of the sessions of each service that
    /// was replaced or stopped in it. Fails when a stop does. Call it once.
    Result<std::vector<ServiceSessions>> finish();

private:
    bool open_ = true;
};

} // namespace velt

#endif
