// The platform's firewall library.
#ifndef VORN_PLATFORM_FIREWALL_H
#define VORN_PLATFORM_FIREWALL_H

extern "C" {

// Makes the firewall follow the configured service ports, in one transaction: on failure the old
// rules stay. Does nothing, successfully, when the box's firewall is switched off.
int VORNFwRuleHup(void);

}  // extern "C"

#endif  // VORN_PLATFORM_FIREWALL_H
