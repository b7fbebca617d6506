// The way into the module.
#ifndef VORN_API_TABLE_H
#define VORN_API_TABLE_H

#include "webapi.h"

#define VORN_EXPORT __attribute__((visibility("default")))

extern "C" {

// Every method that the module offers; a row of zeros ends the table. Never changes.
VORN_EXPORT extern const APIRow gTable[];

// The address of the table's first row. No side effects.
VORN_EXPORT const void* GetAPITable();
}

#endif  // VORN_API_TABLE_H
