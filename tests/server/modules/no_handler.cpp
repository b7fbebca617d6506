// A module with a method that cannot be called.
#include "webapi.h"

static const APIRow table[] = {{"Test.NoHandler", 1, "get", nullptr}, {nullptr, 0, nullptr, nullptr}};

extern "C" __attribute__((visibility("default"))) const void* GetAPITable() { return table; }
