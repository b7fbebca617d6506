#include "nfsAdv.h"

#include "core.h"
#include "firewall.h"
#include "log.h"
#include "nfsconf.h"
#include "service.h"
#include "settings_change.h"

namespace {

constexpr char kSource[] = "nfsAdv";

constexpr Setting kCustomPorts = {"custom_port_enable", Setting::Kind::kSwitchShownAsInteger,
                                  &NFSConfRecord::custom_port_enable, &SettingsChange::service_affected};

// The fixed port of a daemon. A changed port must not belong to another service.
struct Port {
  Setting setting;
  const char* service;   // the name of the daemon in the port test
  const char* conflict;  // the log text of a conflict
};

constexpr Port kPorts[] = {
    {{"statd_port", Setting::Kind::kInteger, &NFSConfRecord::statd_port, &SettingsChange::service_affected},
     "nfs_statd",
     "nfs statd port is conflict"},
    {{"nlm_port", Setting::Kind::kInteger, &NFSConfRecord::nlm_port, &SettingsChange::service_affected},
     "nfs_nlm",
     "nfs nlm is conflict"},
};

// Converts a refused value for the log. A value that cannot be converted is logged as 0.
int AsIntOrZero(const Json::Value& value) { return value.isConvertibleTo(Json::intValue) ? value.asInt() : 0; }

bool CheckSetting(const Setting& setting, const Json::Value& params) {
  const Json::Value& given = params[setting.key];
  if (setting.Accepts(given)) return true;
  if (setting.IsSwitch()) {
    LOG_ERROR("Invalid type of input of %s", setting.key);
  } else {
    LOG_ERROR("Invalid type of input of %s:%d", setting.key, AsIntOrZero(given));
  }
  return false;
}

bool CheckSettings(const Json::Value& params) {
  for (const Setting& setting : kLiveSettings) {
    if (!CheckSetting(setting, params)) return false;
  }
  return CheckSetting(kCustomPorts, params);
}

// The ports are required only while they are used: docs/decisions/0019.
bool CheckPorts(const Json::Value& params) {
  if (!params[kCustomPorts.key].asBool()) return true;
  for (const Port& port : kPorts) {
    if (!CheckSetting(port.setting, params)) return false;
  }
  return true;
}

// Returns whether the port is absent, unchanged or free for the daemon.
bool IsFree(const Port& port, const Json::Value& given, const NFSConfRecord& stored) {
  if (given.isNull() || given.asInt() == stored.*port.setting.field) return true;
  if (WebUtils::IsPortConflict(port.service, given.asInt(), given.asInt()) == 0) return true;
  LOG_ERROR("%s", port.conflict);
  return false;
}

bool PlanPorts(const Json::Value& params, SettingsChange* change) {
  for (const Port& port : kPorts) {
    const Json::Value& given = params[port.setting.key];
    if (!IsFree(port, given, change->stored)) return false;
    port.setting.Plan(given, change);
  }
  return true;
}

// A failure is logged only (docs/decisions/0024): the settings are stored and in force by now.
void ReloadFirewall() {
  if (VORNFwRuleHup() < 0) LOG_ERROR("Failed to reload firewall rules");
}

}  // namespace

void NFSServiceAdvHandler::Get() {
  AnswerWith(HERE, [this](Json::Value& result) { return GetData(result); });
}

void NFSServiceAdvHandler::Set() {
  AnswerTo(HERE, [this](const Json::Value& params) { return CheckData(params) && SetData(params); });
}

bool NFSServiceAdvHandler::GetData(Json::Value& result) {
  const VornConf configuration;
  NFSConfRecord record{};
  if (!ReadRecord(HERE, &record)) return Fail(kPlatformFailure);
  for (const Setting& setting : kLiveSettings) result[setting.key] = setting.Show(record);
  result[kCustomPorts.key] = kCustomPorts.Show(record);
  for (const Port& port : kPorts) result[port.setting.key] = port.setting.Show(record);
  return true;
}

bool NFSServiceAdvHandler::CheckData(const Json::Value& params) {
  return (CheckSettings(params) && CheckPorts(params)) || Fail(kBadParameter);
}

bool NFSServiceAdvHandler::SetData(const Json::Value& params) {
  const VornConf configuration;
  SettingsChange change;
  if (!ReadRecord(HERE, &change.stored) || !ReadRecord(HERE, &change.working)) return Fail(kPlatformFailure);
  change.enabled = IsServiceEnabled();
  change.wanted = params["enable_nfs"].asBool();  // optional here: docs/decisions/0018
  for (const Setting& setting : kLiveSettings) setting.Plan(params[setting.key], &change);
  kCustomPorts.Plan(params[kCustomPorts.key], &change);
  if (!PlanPorts(params, &change)) return Fail(kPortConflict);
  // The order is the reverse of the service API: docs/decisions/0014.
  const bool done = ApplyLive(HERE, change) && StoreRecord(HERE, change.working) && DriveService(HERE, change);
  if (!done) return Fail(kPlatformFailure);
  if (change.service_affected) ReloadFirewall();
  return true;
}
