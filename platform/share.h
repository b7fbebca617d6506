// The platform's share library: shared folders by name.
#ifndef VORN_PLATFORM_SHARE_H
#define VORN_PLATFORM_SHARE_H

extern "C" {

// A shared folder, as it was when it was looked up. Its path is KLIBSharePathGet's (core.h).
typedef struct VORNSHARE VORNSHARE;

// Looks a share up by its exact name. Negative when there is none, or it cannot be read; the error
// facility has the reason, and `*share` is left as it was. Otherwise `*share` is the caller's and
// goes with one VORNShareFree.
int VORNShareGet(const char* name, VORNSHARE** share);

// Releases a handle. Null is allowed.
void VORNShareFree(VORNSHARE* share);

}  // extern "C"

#endif  // VORN_PLATFORM_SHARE_H
