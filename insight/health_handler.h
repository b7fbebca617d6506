// The API "VORN.Core.FileServ.NFS.Health": what is wrong with the NFS service.
#ifndef VORN_INSIGHT_HEALTH_HANDLER_H
#define VORN_INSIGHT_HEALTH_HANDLER_H

#include "handler.h"

// Serves one request. Not thread-safe; each request has its own object. See ServiceHandler for ownership.
class HealthHandler : public ServiceHandler {
 public:
  using ServiceHandler::ServiceHandler;

  // The driver of the method. Answers the request exactly once.
  void Check();

  // Sets "findings", a page of those that match, "total", "counts" of all of these by severity, and "not_checked".
  // Returns true on success. Otherwise logs the reason, records an error code and returns false. Error: 2301.
  bool CheckData(const Json::Value& params, Json::Value& result);
};

#endif  // VORN_INSIGHT_HEALTH_HANDLER_H
