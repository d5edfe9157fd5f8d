#include "platform/firewall.h"

#include "standalone/core/boundary.h"
#include "standalone/core/effects.h"
#include "standalone/firewall/firewall.h"

int VELTFwRuleHup(void) {
    return velt::atBoundary(
        [] { return velt::perform(velt::Effect::firewall, "firewall rules", velt::loadFirewallRules); });
}
