// The platform operation of a server's start. Our own addition to the contract; no module uses it.
#ifndef VORN_PLATFORM_RECOVERY_H
#define VORN_PLATFORM_RECOVERY_H

namespace VORN {

// Removes the temporary files that killed writers left beside the box's configuration files. Takes the configuration
// lock of the box, so the temporary files of a writer that is at work stay. Does not wait for the lock, and fails if
// another program owns it. Returns 0, or -1 with the reason of the
// first failure in the error facility (core.h); the other files are cleaned up all the same. What is left then is
// removed by the next change of its file.
int RemoveLeftovers();

}  // namespace VORN

#endif  // VORN_PLATFORM_RECOVERY_H
