// "VORN.Core.FileServ.NFS.AdvancedSetting": transfer sizes, UNIX permissions and the fixed ports of
// the status daemon and the lock manager.
#ifndef VORN_NFSADV_H
#define VORN_NFSADV_H

#include "handler.h"

class NFSServiceAdvHandler : public ServiceHandler {
 public:
  using ServiceHandler::ServiceHandler;

  void Get();
  void Set();

  // Each answers true, or false with an error code recorded and the reason logged.
  bool GetData(Json::Value& result);
  bool CheckData(const Json::Value& params);
  bool SetData(const Json::Value& params);
};

#endif  // VORN_NFSADV_H
