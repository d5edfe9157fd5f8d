#include "platform/firewall.h"

#include "standalone/control/service_firewall.h"
#include "standalone/core/boundary.h"

int VELTFwRuleHup(void) {
    return velt::atBoundary(velt::openServicePorts);
}
