// The services that the modules administer: which are switched on, and which run.
#ifndef VELT_HOST_API_SERVICE_STATUS_H
#define VELT_HOST_API_SERVICE_STATUS_H

#include "host/http/message.h"
#include "host/module/module_table.h"
#include "standalone/standalone.h"

#include <json/value.h>

#include <optional>
#include <string>
#include <vector>

namespace velt::host {

struct Service {
    std::string name;           ///< "ftp", "ftps", "sftp"
    Json::Value enabled;        ///< as the module tells it; null when it cannot tell
    Json::Value port;           ///< the same
    std::optional<bool> wanted; ///< whether the stored settings ask for it, when they can be read
    bool running = false;
    std::string reason; ///< a sentence why it does not run as the settings say; "" when it does
};

/// Those whose module is loaded. To be called as a read.
std::vector<Service> listServices(const ModuleTable& table, const Principal& principal);

/// "The FTP service does not run. The FTP daemon does not start: ...", of all; "" of none.
std::string sentenceOf(const std::vector<ServiceDown>& down);

Json::Value toObject(const Service& service);
Json::Value toObject(const ServiceDown& down);

} // namespace velt::host

#endif
