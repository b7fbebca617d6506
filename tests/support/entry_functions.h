// The module's entry functions. Servers call them through the API table; tests call them directly.
#ifndef VORN_TESTS_SUPPORT_ENTRY_FUNCTIONS_H
#define VORN_TESTS_SUPPORT_ENTRY_FUNCTIONS_H

#include "webapi.h"

void NFSGet(VORN::APIRequest* request, VORN::APIResponse* response);
void NFSSet(VORN::APIRequest* request, VORN::APIResponse* response);
void NFSGetV2(VORN::APIRequest* request, VORN::APIResponse* response);
void NFSSetV2(VORN::APIRequest* request, VORN::APIResponse* response);
void NFSAdvGet(VORN::APIRequest* request, VORN::APIResponse* response);
void NFSAdvSet(VORN::APIRequest* request, VORN::APIResponse* response);
void NFSKerberosGet(VORN::APIRequest* request, VORN::APIResponse* response);
void NFSKerberosUploadKey(VORN::APIRequest* request, VORN::APIResponse* response);
void NFSKerberosList(VORN::APIRequest* request, VORN::APIResponse* response);
void NFSIDMapList(VORN::APIRequest* request, VORN::APIResponse* response);
void NFSIDMapCreate(VORN::APIRequest* request, VORN::APIResponse* response);
void NFSIDMapSet(VORN::APIRequest* request, VORN::APIResponse* response);
void NFSIDMapDelete(VORN::APIRequest* request, VORN::APIResponse* response);
void NFSSharePrivilegeGet(VORN::APIRequest* request, VORN::APIResponse* response);
void NFSSharePrivilegeSet(VORN::APIRequest* request, VORN::APIResponse* response);

using Entry = void (*)(VORN::APIRequest*, VORN::APIResponse*);

#endif  // VORN_TESTS_SUPPORT_ENTRY_FUNCTIONS_H
