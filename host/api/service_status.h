// The services: which are switched on, and which run.
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
    Json::Value enabled;        ///< by the module's answer; null when it has none
    Json::Value port;           ///< likewise
    std::optional<bool> wanted; ///< by the stored settings; empty when they cannot be read
    bool running = false;
    std::string reason; ///< why it does not run as the settings say, one sentence; "" when it does
};

/// The services of the loaded modules, and those without a module. Call it as a read.
std::vector<Service> listServices(const ModuleTable& table, const Principal& principal);

/// "The FTP service does not run. The FTP daemon does not start: ...", for all of them; "" for none.
std::string sentenceOf(const std::vector<ServiceDown>& down);

Json::Value toObject(const Service& service);
Json::Value toObject(const ServiceDown& down);

} // namespace velt::host

#endif
