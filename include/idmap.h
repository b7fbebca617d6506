// "VORN.Core.FileServ.NFS.IDMap": static NFSv4 ID mappings from Kerberos principals to local users.
#ifndef VORN_IDMAP_H
#define VORN_IDMAP_H

#include <functional>
#include <string>

#include "core.h"
#include "handler.h"
#include "nfsconf.h"

class NFSIDMapServiceHandler : public ServiceHandler {
 public:
  using ServiceHandler::ServiceHandler;

  // The methods.
  void List();
  void Create();
  void Set();
  void Delete();

  // Each answers true, or false with the reason logged and, unless said otherwise, an error code
  // recorded.

  // One page of the configured mappings, or of suggestions for local users. A failed enumeration of
  // users records no code.
  bool ListIDMap(const Json::Value& params, Json::Value& result);
  bool ListDefaultIDMap(const Json::Value& params, Json::Value& result);

  // Puts "root" at the head of the list if it matches the filter, ignoring case. Records no code.
  bool AddRootToList(KLIBSZLIST** list, const std::string& filter);

  // Whether every mapping of the request is one that may be created.
  bool CheckIDMapInput(const Json::Value& idmap);

  // Whether a principal of the request is mapped already; `conflicts` then lists those that are.
  // Logs nothing and records no code.
  bool GetConflictPrincipal(const Json::Value& idmap, Json::Value& conflicts, KLIBSZHASH* table);

  bool CreateIDMap(const Json::Value& params, Json::Value& result);
  bool SetIDMap(const Json::Value& params, Json::Value& result);
  bool DeleteIDMap(const Json::Value& params);

  // Writes the record and has a service that is enabled take it up.
  bool SaveIDMapAndReloadIDMap(_tag_nfs_id_map_* record);

 private:
  using Step = std::function<bool(const Json::Value& params, Json::Value& result)>;

  // The sequence of all four methods: one step with the parameters, which are read once. A failing
  // step may leave details in the result; one that has nothing to say leaves it null.
  void AnswerStep(const CallSite& site, const Step& step);

  bool ListEither(const Json::Value& params, Json::Value& result);
};

#endif  // VORN_IDMAP_H
