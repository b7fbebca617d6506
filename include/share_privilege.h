// "VORN.Core.FileServ.NFS.SharePrivilege": the export rules of one shared folder.
#ifndef VORN_SHARE_PRIVILEGE_H
#define VORN_SHARE_PRIVILEGE_H

#include "handler.h"

class NFSSharePrivilegeHandler : public ServiceHandler {
 public:
  using ServiceHandler::ServiceHandler;

  // The methods "load" and "save".
  void Get();
  void Set();

  // Each answers true, or false with an error code recorded and the reason logged.
  bool GetData(const Json::Value& params, Json::Value& result);
  bool CheckData(const Json::Value& params);
  bool SetData(const Json::Value& params);  // runs on parameters that CheckData accepted
};

#endif  // VORN_SHARE_PRIVILEGE_H
