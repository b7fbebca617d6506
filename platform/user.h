// The platform's user library: who has an account on the box.
#ifndef VORN_PLATFORM_USER_H
#define VORN_PLATFORM_USER_H

#include "core.h"

extern "C" {

enum { VORNUSER_LOCAL = 1 };  // accounts of people in passwd(5), not those of the system

// Appends the names of all accounts of `type` to the list, in the order of the user database.
int VORNUserEnum(KLIBSZLIST** list, int type);

// Likewise, those whose name contains `substring`. `flags` 1: upper and lower case are the same.
int VORNUserEnumBySubstr(KLIBSZLIST** list, int type, const char* substring, int flags);

}  // extern "C"

#endif  // VORN_PLATFORM_USER_H
