// A module without a method.
#include "webapi.h"

static const APIRow table[] = {{nullptr, 0, nullptr, nullptr}};

extern "C" __attribute__((visibility("default"))) const void* GetAPITable() { return table; }
