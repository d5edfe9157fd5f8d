#include "standalone/control/service_firewall.h"

#include "standalone/bans/login_guard.h"
#include "standalone/control/administration_ports.h"
#include "standalone/core/effects.h"
#include "standalone/daemons/daemon.h"
#include "standalone/firewall/firewall_table.h"
#include "standalone/settings/settings.h"

#include <syslog.h>

namespace velt {

Result<FirewallNeeds> firewallNeeds() {
    FirewallNeeds needs;
    for (const Daemon* daemon : allDaemons()) {
        VELT_ASSIGN_OR_RETURN(const auto settings, daemon->settings());
        if (settings.enabled()) {
            for (const DaemonPorts& ports : settings.ports) {
                needs.openPorts.push_back(ports.range);
                // The ports of sessions are of no use to who cannot begin one.
                if (!ports.ofSessions) {
                    needs.loginPorts.push_back(ports.range);
                }
            }
        }
    }
    VELT_ASSIGN_OR_RETURN(needs.banned, sourcesToRefuse());
    // That the file is damaged is for the start of a service to tell: this only words warnings.
    needs.onlyFromHere = loadNetworkSettings().valueOr({}).loopbackOnly;
    needs.administration = administrationPorts;
    return needs;
}

Result<> openServicePorts() {
    return perform(Effect::firewall, "firewall rules", [] { return loadFirewallRules(firewallNeeds); });
}

void followWithFirewall() {
    if (const auto followed = openServicePorts(); !followed) {
        ::syslog(LOG_ERR, "%s", followed.error().message.c_str());
    }
}

} // namespace velt
