// The API "VORN.Core.Share": the entries of shared folders.
#ifndef VORN_SHARE_SHARE_HANDLER_H
#define VORN_SHARE_SHARE_HANDLER_H

#include "handler.h"

// Error codes of this API, beside those of handler.h. The clients have the texts for them.
enum ShareErrorCode : int {
  kShareExists = 2372,    // the name or the folder is shared already
  kShareHasRules = 2373,  // the shared folder still has export rules
  kNoFolder = 2374,       // there is no folder at the path
};

// Serves one request. Not thread-safe; each request has its own object. See ServiceHandler for ownership.
class ShareHandler : public ServiceHandler {
 public:
  using ServiceHandler::ServiceHandler;

  // The drivers of the methods. Each answers the request exactly once.
  void List();
  void Get();
  void Create();
  void Delete();

  // The data functions return true on success. On failure they log the reason, record an error code and return false.

  // Sets "shares", the page of the folders whose name or path contains the filter, sorted by name, and "total". Errors:
  // 2301, 2302.
  bool ListData(const Json::Value& params, Json::Value& result);

  // Sets "name", "path" and "rules", the number of export rules. Errors: 2301, 2302, 2370.
  bool GetData(const Json::Value& params, Json::Value& result);

  // Errors: 2301, 2302, 2372, 2374.
  bool CreateData(const Json::Value& params);

  // Removes the entry of a folder without export rules. Errors: 2301, 2302, 2370, 2373.
  bool DeleteData(const Json::Value& params);
};

#endif  // VORN_SHARE_SHARE_HANDLER_H
