// Whether the call that this thread runs may change the box (platform/call.h).
#ifndef VORN_LINUX_BOX_WRITE_ACCESS_H
#define VORN_LINUX_BOX_WRITE_ACCESS_H

#include <string>

#include "status.h"

namespace vorn {

// True without a call context.
bool MayWrite();

// Fails with EROFS in a call that may not write; `what` is what it would have changed.
Status CheckMayWrite(const std::string& what);

}  // namespace vorn

#endif  // VORN_LINUX_BOX_WRITE_ACCESS_H
