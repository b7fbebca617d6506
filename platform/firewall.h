// The platform's firewall library. Thread-safe.
#ifndef VORN_PLATFORM_FIREWALL_H
#define VORN_PLATFORM_FIREWALL_H

extern "C" {

// Opens the configured ports of the NFS service in the firewall (nft(8)), in one transaction: on failure the old rules
// stay. Returns a non-negative value on success, also if the firewall of the box is switched off, and a negative value
// on failure; the reason is then in the error facility (core.h).
int VORNFwRuleHup(void);

}  // extern "C"

#endif  // VORN_PLATFORM_FIREWALL_H
