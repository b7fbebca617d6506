// The exported interface of the module: the API table and the function that returns it.
//
// The entry functions of the table are exported, too, under their C++ names. They are declared by
// API_METHODS in api_table.cpp, and a server calls them through the table only.
#ifndef VORN_API_TABLE_H
#define VORN_API_TABLE_H

#include "webapi.h"

#define VORN_EXPORT __attribute__((visibility("default")))

// All methods of the module, in a fixed order. The row after the last one is all zero. The table and
// its strings are constant and live as long as the module is loaded.
VORN_EXPORT extern const APIRow gTable[];

// Returns the address of the first row of gTable. The server looks this function up with dlsym(3) by
// its undecorated name. It has no side effects, never fails and is thread-safe.
extern "C" VORN_EXPORT const void* GetAPITable();

#endif  // VORN_API_TABLE_H
