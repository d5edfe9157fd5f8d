#include "standalone/control/service_firewall.h"

#include "standalone/core/effects.h"
#include "standalone/daemons/daemon.h"
#include "standalone/firewall/firewall_table.h"

#include <syslog.h>

namespace velt {

Result<std::vector<VELT_FTP_PORT_RANGE>> enabledPorts() {
    std::vector<VELT_FTP_PORT_RANGE> open;
    for (const Daemon* daemon : allDaemons()) {
        VELT_ASSIGN_OR_RETURN(const auto settings, daemon->settings());
        if (settings.enabled()) {
            for (const DaemonPorts& ports : settings.ports) {
                open.push_back(ports.range);
            }
        }
    }
    return open;
}

Result<> openServicePorts() {
    return perform(Effect::firewall, "firewall rules", [] { return loadFirewallRules(enabledPorts); });
}

void followWithFirewall() {
    if (const auto followed = openServicePorts(); !followed) {
        ::syslog(LOG_ERR, "%s", followed.error().message.c_str());
    }
}

} // namespace velt
