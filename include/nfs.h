// The API "VORN.Core.FileServ.NFS", versions 1 and 2: the switch of the NFS service, NFSv4 and its domain
// (RFC 8881, idmapd.conf(5)), transfer sizes and UNIX permissions.
#ifndef VORN_NFS_H
#define VORN_NFS_H

#include "handler.h"

// Serves one request. Not thread-safe; each request has its own object. See ServiceHandler for ownership.
class NFSServiceHandler : public ServiceHandler {
 public:
  using ServiceHandler::ServiceHandler;

  // The drivers of the methods "get" and "set". Each answers the request exactly once. The drivers of
  // version 2 run the data functions of version 1 (docs/decisions/0015).
  void Get();
  void Set();
  void GetV2();
  void SetV2();

  // The data functions return true on success. On failure they log the reason, record an error code and
  // return false.

  // Sets the six keys of the answer in `result`. Other members of `result` stay. Error: 2302.
  bool GetData(Json::Value& result);

  // Checks the JSON types of the parameters. Calls no platform operation. Error: 2301.
  bool CheckData(const Json::Value& params);

  // Stores the given settings that differ from the stored ones, applies live settings and drives the
  // service. Steps that have succeeded stay when a later step fails (docs/decisions/0030). Error: 2302.
  bool SetData(const Json::Value& params);

  // The same for the keys "enable_nfs", "enable_nfs_v4" and "nfs_v4_domain" only. No driver calls them.
  bool GetDataV2(Json::Value& result);
  bool CheckDataV2(const Json::Value& params);
  bool SetDataV2(const Json::Value& params);
};

#endif  // VORN_NFS_H
