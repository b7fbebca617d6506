// The API "VORN.Core.FileServ.NFS.History": who changed which file, and how a change is taken back.
#ifndef VORN_INSIGHT_HISTORY_HANDLER_H
#define VORN_INSIGHT_HISTORY_HANDLER_H

#include <string>
#include <vector>

#include "handler.h"

// Error codes of this API, beside those of handler.h: 2390 to 2399. The clients have the texts for them.
enum HistoryErrorCode : int {
  kNoChange = 2390,        // the history has no such change
  kUndoConflict = 2391,    // later changes touch the same lines
  kUndoFaulty = 2392,      // a file would become faulty
  kUndoImpossible = 2393,  // a change of this kind cannot be taken back
  kUndoneAlready = 2394,   // the files are as they were before the change
};

// Serves one request. Not thread-safe; each request has its own object. See ServiceHandler for ownership.
class HistoryHandler : public ServiceHandler {
 public:
  using ServiceHandler::ServiceHandler;

  // The drivers of the methods. Each answers the request exactly once.
  void List();
  void Show();
  void Undo();

  // The data functions return true on success. On failure they log the reason, record an error code and return false.

  // Sets "changes", a page of those that match, newest first, and "total". Errors: 2301, 2302.
  bool ListData(const Json::Value& params, Json::Value& result);

  // Sets the members of a change, and "differences". Errors: 2301, 2302, 2390.
  bool ShowData(const Json::Value& params, Json::Value& result);

  // Takes a change back, and makes an enabled service read the files. Errors: 2301, 2302, 2390 to 2394.
  bool UndoData(const Json::Value& params);

 private:
  bool Apply(const std::vector<std::string>& files);
};

#endif  // VORN_INSIGHT_HISTORY_HANDLER_H
