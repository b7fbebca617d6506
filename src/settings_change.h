// The steps that the APIs share which change the NFS configuration record. Those that can fail log
// the reason at the caller's place and answer false.
#ifndef VORN_SRC_SETTINGS_CHANGE_H
#define VORN_SRC_SETTINGS_CHANGE_H

#include "handler.h"
#include "nfsconf.h"

// One request's way from the stored settings to the wanted ones.
struct SettingsChange {
  NFSConfRecord stored{};
  NFSConfRecord working{};  // what will be stored, whole
  bool enabled = false;     // the service is on now
  bool wanted = false;      // the request wants it on
  bool sizes_changed = false;
  bool permissions_changed = false;
  bool service_affected = false;  // something changed that the service only sees when it starts
};

enum class ServiceAction { kNone, kStart, kStop, kRestart };

// What the service needs: nothing while its state stays and nothing affects it. A service that is
// to be off is stopped even if it is off already.
ServiceAction DecideServiceAction(const SettingsChange& change);

bool ReadRecord(const CallSite& site, NFSConfRecord* record);
bool StoreRecord(const CallSite& site, const NFSConfRecord& record);

// Takes given values that differ from the stored ones into the working record.
void PlanTransferSizes(const Json::Value& params, SettingsChange* change);
void PlanUNIXPermissions(const Json::Value& params, SettingsChange* change);

// Tells a service that is on and stays on about changed sizes and permissions.
bool ApplyLive(const CallSite& site, const SettingsChange& change);

bool DriveService(const CallSite& site, const SettingsChange& change);

// Whether a switch is given and is not as stored.
bool SwitchDiffers(const Json::Value& given, int32_t stored);

#endif  // VORN_SRC_SETTINGS_CHANGE_H
