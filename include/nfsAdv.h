// The API "VORN.Core.FileServ.NFS.AdvancedSetting": transfer sizes, UNIX permissions and the fixed ports of
// rpc.statd(8) and the lock manager.
#ifndef VORN_NFSADV_H
#define VORN_NFSADV_H

#include "handler.h"

// Serves one request. Not thread-safe; each request has its own object. See ServiceHandler for ownership.
class NFSServiceAdvHandler : public ServiceHandler {
 public:
  using ServiceHandler::ServiceHandler;

  // The drivers of the methods "get" and "set". Each answers the request exactly once.
  void Get();
  void Set();

  // The data functions return true on success. On failure they log the reason, record an error code and
  // return false.

  // Sets the six keys of the answer in `result`. Error: 2302.
  bool GetData(Json::Value& result);

  // Checks that the parameters are present and have the right JSON types; the ports only if they are used.
  // Calls no platform operation. Error: 2301.
  bool CheckData(const Json::Value& params);

  // Tests changed ports for conflicts, applies live settings, stores the record, drives the service and
  // reloads the firewall. Steps that have succeeded stay when a later step fails (docs/decisions/0030).
  // A failed reload of the firewall is logged only. Errors: 2302, 2303.
  bool SetData(const Json::Value& params);
};

#endif  // VORN_NFSADV_H
