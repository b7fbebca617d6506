// The API "VORN.Core.FileServ.NFS.IDMap": static NFSv4 ID mappings from Kerberos principals to local users
// (idmapd.conf(5), section "Static").
#ifndef VORN_IDMAP_H
#define VORN_IDMAP_H

#include <functional>
#include <string>

#include "core.h"
#include "handler.h"
#include "nfsconf.h"

// Serves one request. Not thread-safe; each request has its own object. See ServiceHandler for ownership.
class NFSIDMapServiceHandler : public ServiceHandler {
 public:
  using ServiceHandler::ServiceHandler;

  // The drivers of the methods "list", "create", "set" and "delete". Each answers the request exactly once.
  void List();
  void Create();
  void Set();
  void Delete();

  // The data functions return true on success. On failure they log the reason, record an error code unless
  // stated otherwise, and return false.

  // Sets "idmap", one page of the configured mappings sorted by principal, and "total". Errors: 2301, 2302.
  bool ListIDMap(const Json::Value& params, Json::Value& result);

  // Sets "idmap", one page of suggested mappings for local users, and "total". Errors: 2301, 2302. Records no
  // code if the users cannot be listed (docs/decisions/0025).
  bool ListDefaultIDMap(const Json::Value& params, Json::Value& result);

  // Inserts "root" at the front of the list if its name contains the filter, ignoring case. The list may move.
  // Records no error code.
  bool AddRootToList(KLIBSZLIST** list, const std::string& filter);

  // Checks that every mapping may be created. Changes nothing. Errors: 2301, 2302, 2352, 2353.
  bool CheckIDMapInput(const Json::Value& idmap);

  // Returns whether a principal of `idmap` is a key of the table. If so, `conflicts` becomes the array of all
  // such principals; otherwise it stays as it is. Logs nothing and records no code.
  bool GetConflictPrincipal(const Json::Value& idmap, Json::Value& conflicts, KLIBSZHASH* table);

  // Adds the mappings and sets "id" to their principals. Errors: 2301, 2302, 2352, 2353, and 2351 with
  // "principal_conflict" in the result.
  bool CreateIDMap(const Json::Value& params, Json::Value& result);

  // Replaces one mapping. Never writes the result. Errors: 2301, 2302, 2351, 2352, 2353.
  bool SetIDMap(const Json::Value& params, Json::Value& result);

  // Removes the mapping or the mappings "id". Errors: 2301, 2302.
  bool DeleteIDMap(const Json::Value& params);

  // Writes the record and makes an enabled service reload it. The record stays the caller's. After a failed
  // reload the record is written all the same. Error: 2302.
  bool SaveIDMapAndReloadIDMap(_tag_nfs_id_map_* record);

 private:
  using Step = std::function<bool(const Json::Value& params, Json::Value& result)>;

  // Runs a method: reads the parameters once, calls the step with them and a null result, and answers. After
  // an error the result is the details of the error, and the parameters are logged for `site`.
  void AnswerStep(const CallSite& site, const Step& step);

  // Lists suggestions if the parameter "suggestion" is true, and the configured mappings otherwise.
  bool ListEither(const Json::Value& params, Json::Value& result);
};

#endif  // VORN_IDMAP_H
