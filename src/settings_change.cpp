#include "settings_change.h"

#include "core.h"
#include "log.h"
#include "service.h"

namespace {

bool ApplySizes(const CallSite& site, const NFSConfRecord& record) {
  if (VORNNFSUDPPrefSizeSet(record.read_size, record.write_size) >= 0) return true;
  LOG_ERROR_AT(site, "VORNNFSUDPPrefSizeSet failed, readsize=[%d], writesize=[%d]", record.read_size,
               record.write_size);
  return false;
}

bool ApplyPermissions(const CallSite& site, const NFSConfRecord& record) {
  if (VORNNFSUNIXPriEnableSet(record.unix_pri_enable) >= 0) return true;
  LOG_ERROR_AT(site, "VORNNFSUNIXPriEnableSet failed, blUNIXPriEnable=[%d]", record.unix_pri_enable);
  return false;
}

int Perform(ServiceAction action) {
  switch (action) {
    case ServiceAction::kStart:
      return KLIBServiceStart(kService, 0);
    case ServiceAction::kStop:
      return KLIBServiceStop(kService, 0);
    case ServiceAction::kRestart:
      return KLIBServiceRestart(kService);
    case ServiceAction::kNone:
      break;
  }
  return 0;
}

}  // namespace

ServiceAction DecideServiceAction(const SettingsChange& change) {
  if (change.enabled == change.wanted && !change.service_affected) return ServiceAction::kNone;
  if (!change.wanted) return ServiceAction::kStop;
  return change.enabled ? ServiceAction::kRestart : ServiceAction::kStart;
}

bool ReadRecord(const CallSite& site, NFSConfRecord* record) {
  if (VORNNFSConfGet(record) >= 0) return true;
  LOG_ERROR_AT(site, "Failed to VORNNFSConfGet.");
  return false;
}

bool StoreRecord(const CallSite& site, const NFSConfRecord& record) {
  if (VORNNFSConfSet(&record) >= 0) return true;
  LOG_ERROR_AT(site, "Failed to VORNNFSConfSet, vornerr=[0x%04X]", KLIBCErrGet());
  return false;
}

bool SwitchDiffers(const Json::Value& given, int32_t stored) {
  return !given.isNull() && given.asBool() != (stored != 0);
}

void PlanTransferSizes(const Json::Value& params, SettingsChange* change) {
  const Json::Value& read_size = params["read_size"];
  if (!read_size.isNull() && read_size.asInt() != change->stored.read_size) {
    change->working.read_size = read_size.asInt();
    change->sizes_changed = true;
  }
  // Unlike the read size this one is compared as a JSON value, type included: callers rely on both.
  const Json::Value& write_size = params["write_size"];
  if (!write_size.isNull() && write_size != Json::Value(change->stored.write_size)) {
    change->working.write_size = write_size.asInt();
    change->sizes_changed = true;
  }
}

void PlanUNIXPermissions(const Json::Value& params, SettingsChange* change) {
  const Json::Value& enable = params["unix_pri_enable"];
  if (!SwitchDiffers(enable, change->stored.unix_pri_enable)) return;
  change->working.unix_pri_enable = enable.asBool() ? 1 : 0;
  change->permissions_changed = true;
}

bool ApplyLive(const CallSite& site, const SettingsChange& change) {
  if (!change.enabled || !change.wanted) return true;
  if (change.sizes_changed && !ApplySizes(site, change.working)) return false;
  return !change.permissions_changed || ApplyPermissions(site, change.working);
}

bool DriveService(const CallSite& site, const SettingsChange& change) {
  const ServiceAction action = DecideServiceAction(change);
  if (Perform(action) == 0) return true;
  // The texts are crossed over with the actions, and log readers match on them as they are.
  if (action == ServiceAction::kStart) {
    LOG_ERROR_AT(site, "failed to restart service nfs");
  } else {
    LOG_ERROR_AT(site, "failed to start service nfs");
  }
  return false;
}
