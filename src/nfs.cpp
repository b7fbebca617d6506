#include "nfs.h"

#include <cstdlib>
#include <cstring>
#include <initializer_list>
#include <string>

#include "core.h"
#include "log.h"
#include "nfsconf.h"
#include "owned.h"
#include "service.h"
#include "settings_change.h"

namespace {

constexpr char kSource[] = "nfs";
constexpr char kIDMapFile[] = "/etc/idmapd.conf";

struct OptionalKey {
  const char* name;
  bool (Json::Value::*is_accepted)() const;
};

bool CheckServiceSwitch(const Json::Value& params) {
  if (params["enable_nfs"].isBool()) return true;
  LOG_ERROR("bool variable 'enable_nfs' is missing.");
  return false;
}

bool CheckOptionalKeys(const Json::Value& params, std::initializer_list<OptionalKey> keys) {
  for (const OptionalKey& key : keys) {
    const Json::Value& value = params[key.name];
    if (value.isNull() || (value.*key.is_accepted)()) continue;
    LOG_ERROR("Invalid type of input.");
    return false;
  }
  return true;
}

void AddServiceAndNFSv4(const NFSConfRecord& record, const IDMap& id_map, Json::Value& result) {
  result["enable_nfs"] = IsServiceEnabled();
  result["enable_nfs_v4"] = record.enable_nfs_v4 != 0;
  result["nfs_v4_domain"] = id_map->domain == nullptr ? "" : id_map->domain;
}

bool ReadSettings(NFSConfRecord* record, IDMap* id_map) {
  if (!ReadRecord(HERE, record)) return false;
  id_map->reset(VORNNFSIDMapGet());
  if (*id_map) return true;
  LOG_ERROR("Failed to VORNNFSIDMapGet, vornerr = [0x%04X]", KLIBCErrGet());
  return false;
}

void PlanServiceAndNFSv4(const Json::Value& params, SettingsChange* change) {
  change->enabled = IsServiceEnabled();
  change->wanted = params["enable_nfs"].asBool();
  const Json::Value& enable_nfs_v4 = params["enable_nfs_v4"];
  if (!SwitchDiffers(enable_nfs_v4, change->stored.enable_nfs_v4)) return;
  change->working.enable_nfs_v4 = enable_nfs_v4.asBool() ? 1 : 0;
  change->service_affected = true;
}

bool ReplaceDomain(const std::string& domain, _tag_nfs_id_map_* id_map) {
  char* const copy = strdup(domain.c_str());
  if (copy == nullptr) {
    LOG_ERROR("Failed to strdup: %s", strerror(errno));
    return false;
  }
  free(id_map->domain);
  id_map->domain = copy;
  if (VORNNFSIDMapSet(kIDMapFile, id_map) >= 0) return true;
  LOG_ERROR("Failed to VORNNFSIDMapSet, vornerr=[0x%04X]", KLIBCErrGet());
  return false;
}

// Writes a given domain that is new, if NFSv4 is to be on. The ID map stays the caller's, so that
// nobody else changes it before the request is done.
bool SaveDomain(const Json::Value& params, SettingsChange* change, IDMap* id_map) {
  const Json::Value& domain = params["nfs_v4_domain"];
  if (change->working.enable_nfs_v4 == 0 || domain.isNull()) return true;
  id_map->reset(VORNNFSIDMapGet());
  if (!*id_map) {
    LOG_ERROR("Failed to VORNNFSIDMapGet, vornerr=[0x%04X]", KLIBCErrGet());
    return false;
  }
  if ((*id_map)->domain == nullptr) {
    LOG_ERROR("szDomain should not be NULL");
    return false;
  }
  if (domain.asString() == (*id_map)->domain) return true;
  change->service_affected = true;
  return ReplaceDomain(domain.asString(), id_map->get());
}

}  // namespace

void NFSServiceHandler::Get() {
  AnswerWith(HERE, [this](Json::Value& result) { return GetData(result); });
}

void NFSServiceHandler::Set() {
  AnswerTo(HERE, [this](const Json::Value& params) { return CheckData(params) && SetData(params); });
}

void NFSServiceHandler::GetV2() {
  AnswerWith(HERE, [this](Json::Value& result) { return GetData(result); });
}

void NFSServiceHandler::SetV2() {
  AnswerTo(HERE, [this](const Json::Value& params) { return CheckData(params) && SetData(params); });
}

bool NFSServiceHandler::GetData(Json::Value& result) {
  const VornConf configuration;
  NFSConfRecord record{};
  IDMap id_map;
  if (!ReadSettings(&record, &id_map)) return Fail(kPlatformFailure);
  AddServiceAndNFSv4(record, id_map, result);
  result["read_size"] = record.read_size;
  result["write_size"] = record.write_size;
  result["unix_pri_enable"] = record.unix_pri_enable != 0;
  return true;
}

bool NFSServiceHandler::CheckData(const Json::Value& params) {
  const bool accepted =
      CheckServiceSwitch(params) && CheckOptionalKeys(params, {
                                                                  {"enable_nfs_v4", &Json::Value::isBool},
                                                                  {"nfs_v4_domain", &Json::Value::isString},
                                                                  {"read_size", &Json::Value::isInt},
                                                                  {"write_size", &Json::Value::isInt},
                                                                  {"unix_pri_enable", &Json::Value::isBool},
                                                              });
  return accepted || Fail(kBadParameter);
}

bool NFSServiceHandler::SetData(const Json::Value& params) {
  const VornConf configuration;
  SettingsChange change;
  if (!ReadRecord(HERE, &change.stored)) return Fail(kPlatformFailure);
  change.working = change.stored;
  PlanServiceAndNFSv4(params, &change);
  IDMap id_map;
  if (!SaveDomain(params, &change, &id_map)) return Fail(kPlatformFailure);
  PlanTransferSizes(params, &change);
  PlanUNIXPermissions(params, &change);
  const bool done = StoreRecord(HERE, change.working) && ApplyLive(HERE, change) && DriveService(HERE, change);
  return done || Fail(kPlatformFailure);
}

bool NFSServiceHandler::GetDataV2(Json::Value& result) {
  const VornConf configuration;
  NFSConfRecord record{};
  IDMap id_map;
  if (!ReadSettings(&record, &id_map)) return Fail(kPlatformFailure);
  AddServiceAndNFSv4(record, id_map, result);
  return true;
}

bool NFSServiceHandler::CheckDataV2(const Json::Value& params) {
  const bool accepted =
      CheckServiceSwitch(params) && CheckOptionalKeys(params, {
                                                                  {"enable_nfs_v4", &Json::Value::isBool},
                                                                  {"nfs_v4_domain", &Json::Value::isString},
                                                              });
  return accepted || Fail(kBadParameter);
}

bool NFSServiceHandler::SetDataV2(const Json::Value& params) {
  const VornConf configuration;
  SettingsChange change;
  if (!ReadRecord(HERE, &change.stored) || !ReadRecord(HERE, &change.working)) return Fail(kPlatformFailure);
  PlanServiceAndNFSv4(params, &change);
  IDMap id_map;
  if (!SaveDomain(params, &change, &id_map)) return Fail(kPlatformFailure);
  return (StoreRecord(HERE, change.working) && DriveService(HERE, change)) || Fail(kPlatformFailure);
}
