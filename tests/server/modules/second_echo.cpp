// A module that offers a method of its own and one that the echo module has.
#include "webapi.h"

static void Get(VORN::APIRequest* /*request*/, VORN::APIResponse* response) { response->SetSuccess("second"); }

static const APIRow table[] = {
    {"Test.Echo", 1, "get", Get}, {"Test.Second", 1, "get", Get}, {nullptr, 0, nullptr, nullptr}};

extern "C" __attribute__((visibility("default"))) const void* GetAPITable() { return table; }
