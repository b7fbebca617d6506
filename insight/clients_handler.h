// The API "VORN.Core.FileServ.NFS.Client": who is connected, who was turned away; and the end of a client's state.
#ifndef VORN_INSIGHT_CLIENTS_HANDLER_H
#define VORN_INSIGHT_CLIENTS_HANDLER_H

#include "handler.h"

// Error codes of this API, beside those of handler.h: 2395.
enum ClientsErrorCode : int {
  kClientGone = 2395,  // there is no such client any more
};

// Serves one request. Not thread-safe; each request has its own object. See ServiceHandler for ownership.
class ClientsHandler : public ServiceHandler {
 public:
  using ServiceHandler::ServiceHandler;

  // The drivers of the methods. Each answers the request exactly once.
  void List();
  void Disconnect();

  // The data functions return true on success. On failure they log the reason, record an error code and return false.

  // Sets "clients", a page of those that match, and "total". Errors: 2301, 2302.
  bool ListData(const Json::Value& params, Json::Value& result);

  // Ends the state of a client of NFSv4. Errors: 2301, 2302, 2395.
  bool DisconnectData(const Json::Value& params);
};

#endif  // VORN_INSIGHT_CLIENTS_HANDLER_H
