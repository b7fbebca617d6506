// The platform's user library: the accounts of the box (passwd(5)). Thread-safe on different lists.
#ifndef VORN_PLATFORM_USER_H
#define VORN_PLATFORM_USER_H

#include "core.h"

extern "C" {

// Local accounts of people. System accounts are those outside UID_MIN to UID_MAX of login.defs(5).
enum { VORNUSER_LOCAL = 1 };

// Appends the names of all accounts of `type` to the list, in the order of the user database. The list may move.
// Returns a negative value on failure; the reason is then in the error facility (core.h).
int VORNUserEnum(KLIBSZLIST** list, int type);

// Does the same for the accounts whose name contains `substring`. With `flags` 1 the comparison ignores case.
int VORNUserEnumBySubstr(KLIBSZLIST** list, int type, const char* substring, int flags);

}  // extern "C"

#endif  // VORN_PLATFORM_USER_H
