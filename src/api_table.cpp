#include "api_table.h"

#include "nfs.h"

// Every method: API, version, method; its entry function; the handler class and the driver that serve it.
// clang-format off
#define API_METHODS(METHOD)                                                                             \
  METHOD("VORN.Core.FileServ.NFS", 1, "get", NFSGet, NFSServiceHandler, Get)                            \
  METHOD("VORN.Core.FileServ.NFS", 1, "set", NFSSet, NFSServiceHandler, Set)                            \
  METHOD("VORN.Core.FileServ.NFS", 2, "get", NFSGetV2, NFSServiceHandler, GetV2)                        \
  METHOD("VORN.Core.FileServ.NFS", 2, "set", NFSSetV2, NFSServiceHandler, SetV2)
// clang-format on

// An entry function builds the handler, runs one driver and lets what it throws pass.
#define ENTRY_FUNCTION(api, version, method, entry, handler, driver)                          \
  extern "C" VORN_EXPORT void entry(VORN::APIRequest* request, VORN::APIResponse* response) { \
    handler(request, response).driver();                                                      \
  }

#define TABLE_ROW(api, version, method, entry, handler, driver) {api, version, method, entry},

API_METHODS(ENTRY_FUNCTION)

extern "C" {

const APIRow gTable[] = {API_METHODS(TABLE_ROW){nullptr, 0, nullptr, nullptr}};

const void* GetAPITable() { return gTable; }
}
