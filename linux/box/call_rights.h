// The rights of the call that this thread runs (platform/call.h).
#ifndef VORN_LINUX_BOX_CALL_RIGHTS_H
#define VORN_LINUX_BOX_CALL_RIGHTS_H

#include <string>

#include "status.h"

namespace vorn {

// Whether the thread has a call context.
bool HasCallContext();

// Whether the call may change the box. True without a call context.
bool MayWrite();

// Fails with EROFS in a call that may not write; `what` is what it would have changed.
Status CheckMayWrite(const std::string& what);

// Whether the call is a rehearsal: what it reports as done is not done. False without a call context.
bool IsRehearsal();

// Whether `path` is a file of this system that was uploaded with the call. False without a call context.
bool IsUpload(const std::string& path);

}  // namespace vorn

#endif  // VORN_LINUX_BOX_CALL_RIGHTS_H
