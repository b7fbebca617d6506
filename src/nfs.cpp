#include "nfs.h"

#include <array>
#include <cstdlib>
#include <cstring>
#include <iterator>
#include <string>
#include <string_view>

#include "core.h"
#include "json_members.h"
#include "json_text.h"
#include "log.h"
#include "nfsconf.h"
#include "owned.h"
#include "service.h"
#include "settings_change.h"

namespace {

constexpr char kSource[] = "nfs";
constexpr char kIDMapFile[] = "/etc/idmapd.conf";

constexpr Setting kEnableNFSv4 = {"enable_nfs_v4", Setting::Kind::kSwitch, &NFSConfRecord::enable_nfs_v4,
                                  &SettingsChange::service_affected};

constexpr auto ParameterNames() {
  std::array<std::string_view, 3 + std::size(kLiveSettings)> names = {"enable_nfs", kEnableNFSv4.key, "nfs_v4_domain"};
  for (size_t i = 0; i < std::size(kLiveSettings); ++i) names[3 + i] = kLiveSettings[i].key;
  return names;
}

constexpr auto kParameters = ParameterNames();

// The parameters of "set".
class ServiceParameters {
 public:
  explicit ServiceParameters(const Json::Value& params) {
    FindMembers(params, kParameters.begin(), kParameters.end(), members_.data());
  }

  const Json::Value& enable_nfs() const { return *members_[0]; }
  const Json::Value& enable_nfs_v4() const { return *members_[1]; }
  const Json::Value& nfs_v4_domain() const { return *members_[2]; }

  // The value of kLiveSettings[index].
  const Json::Value& Live(size_t index) const { return *members_[3 + index]; }

 private:
  std::array<const Json::Value*, kParameters.size()> members_{};  // in the order of kParameters
};

bool CheckServiceSwitch(const ServiceParameters& given) {
  if (given.enable_nfs().isBool()) return true;
  LOG_ERROR("bool variable 'enable_nfs' is missing.");
  return false;
}

bool IsAcceptedOrAbsent(const Setting& setting, const Json::Value& given) {
  return given.isNull() || setting.Accepts(given);
}

bool HasNFSv4Types(const ServiceParameters& given) {
  return IsAcceptedOrAbsent(kEnableNFSv4, given.enable_nfs_v4()) &&
         (given.nfs_v4_domain().isNull() || given.nfs_v4_domain().isString());
}

bool HasLiveTypes(const ServiceParameters& given) {
  for (size_t i = 0; i < std::size(kLiveSettings); ++i) {
    if (!IsAcceptedOrAbsent(kLiveSettings[i], given.Live(i))) return false;
  }
  return true;
}

bool CheckTypes(bool accepted) {
  if (!accepted) LOG_ERROR("Invalid type of input.");
  return accepted;
}

bool CheckParameters(const ServiceParameters& given) {
  return CheckServiceSwitch(given) && CheckTypes(HasNFSv4Types(given) && HasLiveTypes(given));
}

void AddServiceAndNFSv4(const NFSConfRecord& record, const IDMap& id_map, Json::Value& result) {
  result["enable_nfs"] = IsServiceEnabled();
  result[kEnableNFSv4.key] = kEnableNFSv4.Show(record);
  result["nfs_v4_domain"] = id_map->domain == nullptr ? "" : id_map->domain;
}

// The ID map is read even if NFSv4 is disabled: docs/decisions/0017.
bool ReadSettings(NFSConfRecord* record, IDMap* id_map) {
  if (!ReadRecord(HERE, record)) return false;
  id_map->reset(VORNNFSIDMapGet());
  if (*id_map) return true;
  LOG_ERROR("Failed to VORNNFSIDMapGet, vornerr = [0x%04X]", KLIBCErrGet());
  return false;
}

void PlanServiceAndNFSv4(const ServiceParameters& given, SettingsChange* change) {
  change->enabled = IsServiceEnabled();
  change->wanted = given.enable_nfs().asBool();
  kEnableNFSv4.Plan(given.enable_nfs_v4(), change);
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

// Writes the given domain if NFSv4 will be enabled and the domain differs from the stored one. The caller keeps the
// ID-map record until the end of the request: it holds the configuration lock.
bool SaveDomain(const Json::Value& domain, SettingsChange* change, IDMap* id_map) {
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
  if (TextOf(domain) == (*id_map)->domain) return true;
  change->service_affected = true;
  return ReplaceDomain(domain.asString(), id_map->get());
}

// Stores the record first and then applies it: docs/decisions/0014.
bool ApplyParameters(const ServiceParameters& given) {
  const VornConf configuration;
  SettingsChange change;
  if (!ReadRecord(HERE, &change.stored)) return false;
  change.working = change.stored;
  PlanServiceAndNFSv4(given, &change);
  IDMap id_map;
  if (!SaveDomain(given.nfs_v4_domain(), &change, &id_map)) return false;
  for (size_t i = 0; i < std::size(kLiveSettings); ++i) kLiveSettings[i].Plan(given.Live(i), &change);
  return StoreRecord(HERE, change.working) && ApplyLive(HERE, change) && DriveService(HERE, change);
}

}  // namespace

void NFSServiceHandler::Get() {
  AnswerWith(HERE, [this](Json::Value& result) { return GetData(result); });
}

void NFSServiceHandler::Set() {
  AnswerTo(HERE, [this](const Json::Value& params) { return CheckData(params) && SetData(params); });
}

// Version 2 runs the data functions of version 1: docs/decisions/0015.
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
  for (const Setting& setting : kLiveSettings) result[setting.key] = setting.Show(record);
  return true;
}

bool NFSServiceHandler::CheckData(const Json::Value& params) {
  return CheckParameters(ServiceParameters(params)) || Fail(kBadParameter);
}

bool NFSServiceHandler::SetData(const Json::Value& params) {
  return ApplyParameters(ServiceParameters(params)) || Fail(kPlatformFailure);
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
  const ServiceParameters given(params);
  return (CheckServiceSwitch(given) && CheckTypes(HasNFSv4Types(given))) || Fail(kBadParameter);
}

bool NFSServiceHandler::SetDataV2(const Json::Value& params) {
  const VornConf configuration;
  SettingsChange change;
  if (!ReadRecord(HERE, &change.stored) || !ReadRecord(HERE, &change.working)) return Fail(kPlatformFailure);
  const ServiceParameters given(params);
  PlanServiceAndNFSv4(given, &change);
  IDMap id_map;
  if (!SaveDomain(given.nfs_v4_domain(), &change, &id_map)) return Fail(kPlatformFailure);
  return (StoreRecord(HERE, change.working) && DriveService(HERE, change)) || Fail(kPlatformFailure);
}
