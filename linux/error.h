// The one boundary between the platform's inside, where a failure is a value, and its operations,
// where it is a negative result and an entry in the error facility (core.h).
#ifndef VORN_LINUX_ERROR_H
#define VORN_LINUX_ERROR_H

#include "status.h"

namespace vorn {

// Leaves a failure in this thread's error facility and its reason in the log. 0, or -1.
int ToResult(const Status& status);

// Likewise, without the log: for an answer that callers ask for, such as "not in this list".
int ToSilentResult(const Status& status);

}  // namespace vorn

#endif  // VORN_LINUX_ERROR_H
