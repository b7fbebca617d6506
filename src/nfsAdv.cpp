#include "nfsAdv.h"

#include "core.h"
#include "firewall.h"
#include "log.h"
#include "nfsconf.h"
#include "service.h"
#include "settings_change.h"

namespace {

constexpr char kSource[] = "nfsAdv";

// For the log: what cannot be converted reads as 0.
int AsIntOrZero(const Json::Value& value) { return value.isConvertibleTo(Json::intValue) ? value.asInt() : 0; }

bool CheckInteger(const Json::Value& params, const char* key) {
  const Json::Value& value = params[key];
  if (value.isInt()) return true;
  LOG_ERROR("Invalid type of input of %s:%d", key, AsIntOrZero(value));
  return false;
}

bool CheckBoolean(const Json::Value& params, const char* key) {
  if (params[key].isBool()) return true;
  LOG_ERROR("Invalid type of input of %s", key);
  return false;
}

bool CheckPorts(const Json::Value& params) {
  if (!params["custom_port_enable"].asBool()) return true;
  return CheckInteger(params, "statd_port") && CheckInteger(params, "nlm_port");
}

// Whether a port is given that is not the stored one and that belongs to somebody else.
bool PlanPort(const Json::Value& port, const char* service, int32_t NFSConfRecord::*field, SettingsChange* change) {
  if (port.isNull() || port.asInt() == change->stored.*field) return true;
  if (WebUtils::IsPortConflict(service, port.asInt(), port.asInt()) != 0) return false;
  change->working.*field = port.asInt();
  change->service_affected = true;
  return true;
}

bool PlanPorts(const Json::Value& params, SettingsChange* change) {
  const Json::Value& enable = params["custom_port_enable"];
  if (SwitchDiffers(enable, change->stored.custom_port_enable)) {
    change->working.custom_port_enable = enable.asBool() ? 1 : 0;
    change->service_affected = true;
  }
  if (!PlanPort(params["statd_port"], "nfs_statd", &NFSConfRecord::statd_port, change)) {
    LOG_ERROR("nfs statd port is conflict");
    return false;
  }
  if (!PlanPort(params["nlm_port"], "nfs_nlm", &NFSConfRecord::nlm_port, change)) {
    LOG_ERROR("nfs nlm is conflict");
    return false;
  }
  return true;
}

// Settings are in force by now: a firewall that does not follow is a matter for the log.
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
  result["read_size"] = record.read_size;
  result["write_size"] = record.write_size;
  result["unix_pri_enable"] = record.unix_pri_enable != 0;
  result["statd_port"] = record.statd_port;
  result["nlm_port"] = record.nlm_port;
  result["custom_port_enable"] = record.custom_port_enable;  // an integer here, though set takes a boolean
  return true;
}

bool NFSServiceAdvHandler::CheckData(const Json::Value& params) {
  const bool accepted = CheckInteger(params, "read_size") && CheckInteger(params, "write_size") &&
                        CheckBoolean(params, "unix_pri_enable") && CheckBoolean(params, "custom_port_enable") &&
                        CheckPorts(params);
  return accepted || Fail(kBadParameter);
}

bool NFSServiceAdvHandler::SetData(const Json::Value& params) {
  const VornConf configuration;
  SettingsChange change;
  if (!ReadRecord(HERE, &change.stored) || !ReadRecord(HERE, &change.working)) return Fail(kPlatformFailure);
  change.enabled = IsServiceEnabled();
  change.wanted = params["enable_nfs"].asBool();
  PlanTransferSizes(params, &change);
  PlanUNIXPermissions(params, &change);
  if (!PlanPorts(params, &change)) return Fail(kPortConflict);
  // Live first, stored second: a setting that the service refuses is not stored.
  const bool done = ApplyLive(HERE, change) && StoreRecord(HERE, change.working) && DriveService(HERE, change);
  if (!done) return Fail(kPlatformFailure);
  if (change.service_affected) ReloadFirewall();
  return true;
}
