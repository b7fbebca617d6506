// The API "VORN.Core.FileServ.NFS.SharePrivilege": the export rules of one shared folder (exports(5)).
#ifndef VORN_SHARE_PRIVILEGE_H
#define VORN_SHARE_PRIVILEGE_H

#include "handler.h"

// Serves one request. Not thread-safe; each request has its own object. See ServiceHandler for ownership.
class NFSSharePrivilegeHandler : public ServiceHandler {
 public:
  using ServiceHandler::ServiceHandler;

  // The drivers of the methods "load" and "save" (docs/decisions/0022). Each answers the request exactly once.
  void Get();
  void Set();

  // The data functions return true on success. On failure they log the reason, record an error code and
  // return false.

  // Sets "rule", the array of the share's rules in the platform's order. Errors: 2301, 2302, 2370.
  bool GetData(const Json::Value& params, Json::Value& result);

  // Checks the share and every key of every rule. Changes nothing. Errors: 2301, 2370, 2371.
  bool CheckData(const Json::Value& params);

  // Replaces all rules of the share and reloads the service; a failed reload is ignored (docs/decisions/0024).
  // Precondition: CheckData accepted the parameters. Errors: 2302, 2370.
  bool SetData(const Json::Value& params);
};

#endif  // VORN_SHARE_PRIVILEGE_H
