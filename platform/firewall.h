// The firewall.
#ifndef VELT_PLATFORM_FIREWALL_H
#define VELT_PLATFORM_FIREWALL_H

#ifdef __cplusplus
extern "C" {
#endif

/// Makes the firewall rules follow the stored ports of the services. Negative on failure, which
/// leaves the rules in force as they were. May be called from any thread.
int VELTFwRuleHup(void);

#ifdef __cplusplus
}
#endif

#endif
