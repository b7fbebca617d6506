// The boundary between the inside of the platform, where failures are values, and its operations, where a failure is
// a negative result and an entry in the error facility (core.h).
#ifndef VORN_LINUX_CONTRACT_ERROR_H
#define VORN_LINUX_CONTRACT_ERROR_H

#include "status.h"

namespace vorn {

// 0 for success. For a failure it fills this thread's error facility, logs the reason, adds the reason to the call
// context (call.h), and returns -1.
int ToResult(const Status& status);

// The same without log and call context, for an answer that callers expect, such as "not in this list".
int ToSilentResult(const Status& status);

}  // namespace vorn

#endif  // VORN_LINUX_CONTRACT_ERROR_H
