#include "api_table.h"

#include "idmap.h"
#include "kerberos.h"
#include "nfs.h"
#include "nfsAdv.h"
#include "share_privilege.h"

// One row per method: API, version and method name; the entry function; the handler class and the driver it runs.
// clang-format off
#define API_METHODS(METHOD)                                                                                                    \
  METHOD("VORN.Core.FileServ.NFS", 1, "get", NFSGet, NFSServiceHandler, Get)                                                   \
  METHOD("VORN.Core.FileServ.NFS", 1, "set", NFSSet, NFSServiceHandler, Set)                                                   \
  METHOD("VORN.Core.FileServ.NFS", 2, "get", NFSGetV2, NFSServiceHandler, GetV2)                                               \
  METHOD("VORN.Core.FileServ.NFS", 2, "set", NFSSetV2, NFSServiceHandler, SetV2)                                               \
  METHOD("VORN.Core.FileServ.NFS.AdvancedSetting", 1, "get", NFSAdvGet, NFSServiceAdvHandler, Get)                             \
  METHOD("VORN.Core.FileServ.NFS.AdvancedSetting", 1, "set", NFSAdvSet, NFSServiceAdvHandler, Set)                             \
  METHOD("VORN.Core.FileServ.NFS.Kerberos", 1, "get", NFSKerberosGet, NFSKerberosServiceHandler, Get)                          \
  METHOD("VORN.Core.FileServ.NFS.Kerberos", 1, "upload_key", NFSKerberosUploadKey, NFSKerberosServiceHandler, UploadKey)       \
  METHOD("VORN.Core.FileServ.NFS.Kerberos", 1, "list", NFSKerberosList, NFSKerberosServiceHandler, List)                       \
  METHOD("VORN.Core.FileServ.NFS.IDMap", 1, "list", NFSIDMapList, NFSIDMapServiceHandler, List)                                \
  METHOD("VORN.Core.FileServ.NFS.IDMap", 1, "create", NFSIDMapCreate, NFSIDMapServiceHandler, Create)                          \
  METHOD("VORN.Core.FileServ.NFS.IDMap", 1, "set", NFSIDMapSet, NFSIDMapServiceHandler, Set)                                   \
  METHOD("VORN.Core.FileServ.NFS.IDMap", 1, "delete", NFSIDMapDelete, NFSIDMapServiceHandler, Delete)                          \
  METHOD("VORN.Core.FileServ.NFS.SharePrivilege", 1, "load", NFSSharePrivilegeGet, NFSSharePrivilegeHandler, Get)              \
  METHOD("VORN.Core.FileServ.NFS.SharePrivilege", 1, "save", NFSSharePrivilegeSet, NFSSharePrivilegeHandler, Set)
// clang-format on

// An entry function constructs the handler, runs one driver and propagates every exception.
#define ENTRY_FUNCTION(api, version, method, entry, handler, driver)               \
  VORN_EXPORT void entry(VORN::APIRequest* request, VORN::APIResponse* response) { \
    handler(request, response).driver();                                           \
  }

#define TABLE_ROW(api, version, method, entry, handler, driver) {api, version, method, entry},

API_METHODS(ENTRY_FUNCTION)

const APIRow gTable[] = {API_METHODS(TABLE_ROW){nullptr, 0, nullptr, nullptr}};

const void* GetAPITable() { return gTable; }
