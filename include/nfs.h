// "VORN.Core.FileServ.NFS": the service's switch, NFSv4 and its domain, transfer sizes, UNIX
// permissions.
#ifndef VORN_NFS_H
#define VORN_NFS_H

#include "handler.h"

class NFSServiceHandler : public ServiceHandler {
 public:
  using ServiceHandler::ServiceHandler;

  // The methods. Version 2 answers as version 1: it runs the same data functions.
  void Get();
  void Set();
  void GetV2();
  void SetV2();

  // Each answers true, or false with an error code recorded and the reason logged.
  bool GetData(Json::Value& result);
  bool CheckData(const Json::Value& params);
  bool SetData(const Json::Value& params);

  // Those of the service's switch, NFSv4 and its domain alone. No method runs them.
  bool GetDataV2(Json::Value& result);
  bool CheckDataV2(const Json::Value& params);
  bool SetDataV2(const Json::Value& params);
};

#endif  // VORN_NFS_H
