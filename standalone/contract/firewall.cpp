#include "platform/firewall.h"

#include "standalone/contract/boundary.h"
#include "standalone/control/service_firewall.h"

int VELTFwRuleHup(void) {
    return velt::atBoundary(velt::openServicePorts);
}
