// The platform's share library: shared folders by name. Thread-safe on different handles.
#ifndef VORN_PLATFORM_SHARE_H
#define VORN_PLATFORM_SHARE_H

extern "C" {

// A shared folder as it was at the lookup. KLIBSharePathGet (core.h) returns its path.
typedef struct VORNSHARE VORNSHARE;

// Looks up a share by its exact name and stores its handle in `*share`. The handle belongs to the caller, who releases
// it with VORNShareFree. Returns a negative value if there is no such share, if it cannot be read, or if its path does
// not fit into the path of an ExportRuleList (507 bytes, nfsconf.h); `*share` is then unchanged and the reason is in
// the error facility (core.h).
int VORNShareGet(const char* name, VORNSHARE** share);

// Releases a handle. Accepts null.
void VORNShareFree(VORNSHARE* share);

}  // extern "C"

#endif  // VORN_PLATFORM_SHARE_H
