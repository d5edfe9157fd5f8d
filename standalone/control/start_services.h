// Starting what is enabled, and stopping everything.
#ifndef VELT_STANDALONE_CONTROL_START_SERVICES_H
#define VELT_STANDALONE_CONTROL_START_SERVICES_H

#include "base/result.h"
#include "standalone/control/service_request.h"

#include <string_view>
#include <vector>

namespace velt {

/// Makes the daemons follow the stored settings after a boot: starts what is enabled, ends what is not.
/// Blocks until each daemon accepts connections or has failed. One that fails does not keep the others from
/// starting; each failure goes to syslog, and the first one is returned.
Result<> startEnabledServices();

/// The same when nobody has asked for it, at the start of the host: failures go to the administrator log as
/// well, where those of a request have its answer.
Result<> startServicesAtBoot();

/// Ends the daemons and their sessions. The settings stay as they are stored, so that startEnabledServices
/// starts the same ones again. Failures are treated in the same way.
Result<> stopServices();

/// Has the daemon ("ftp" or "sftp"; all for "") give way to a new one, with the configuration, certificate,
/// host keys and programs of now, and starts one that is on and does not run. FTP accepts connections all the
/// time, SFTP but for some milliseconds. A daemon that does not come up leaves the former one serving. Tells
/// what became of the sessions of each service that is on; failures are treated in the same way. Within a
/// ServiceRequest, that one's policy counts.
Result<std::vector<ServiceSessions>> restartServices(SessionPolicy policy, std::string_view service = {});

} // namespace velt

#endif
