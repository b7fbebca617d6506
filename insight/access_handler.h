// The API "VORN.Core.FileServ.NFS.Access": what a client may do in a shared folder, and why.
#ifndef VORN_INSIGHT_ACCESS_HANDLER_H
#define VORN_INSIGHT_ACCESS_HANDLER_H

#include "handler.h"

// Error codes of this API, beside those of handler.h: 2380 to 2389. The clients have the texts for them.
enum AccessErrorCode : int {
  kNoUser = 2380,   // the box has no such user
  kNoGroup = 2381,  // the box has no such group
};

// Serves one request. Not thread-safe; each request has its own object. See ServiceHandler for ownership.
class AccessHandler : public ServiceHandler {
 public:
  using ServiceHandler::ServiceHandler;

  // The drivers of the methods. Each answers the request exactly once.
  void Explain();
  void Matrix();

  // The data functions return true on success. On failure they log the reason, record an error code and return false.

  // Sets the members of VORN::AccessAnswer (access.h). Errors: 2301, 2302, 2370, 2380, 2381.
  bool ExplainData(const Json::Value& params, Json::Value& result);

  // With "client" sets "access", a page of rows: what the client may do in each shared folder, sorted by name. With
  // "share" sets "clients", a page of rows: what each client may do in this folder. The other list is empty. Sets
  // "total". Errors: 2301 (also for both, and for neither), 2302, 2370 (also if a folder was removed meanwhile), 2380,
  // 2381.
  bool MatrixData(const Json::Value& params, Json::Value& result);

 private:
  bool ListShares(const Json::Value& params, Json::Value& result);
  bool ListClients(const Json::Value& params, Json::Value& result);
};

#endif  // VORN_INSIGHT_ACCESS_HANDLER_H
