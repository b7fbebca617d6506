// The settings of the NFS configuration record, and the steps that every API shares which changes them.
//
// A step that can fail logs the reason at the given call site (docs/decisions/0002) and returns false.
// The functions of this header have no state: they are thread-safe on different objects.
#ifndef VORN_SRC_SETTINGS_CHANGE_H
#define VORN_SRC_SETTINGS_CHANGE_H

#include "handler.h"
#include "nfsconf.h"

// A change of the settings by one request.
struct SettingsChange {
  NFSConfRecord stored{};      // the record as read
  NFSConfRecord working{};     // the record to be written
  bool enabled = false;        // the service is enabled now
  bool wanted = false;         // the request wants the service enabled
  bool sizes_changed = false;  // a transfer size changes
  bool permissions_changed = false;
  bool service_affected = false;  // a setting changes that takes effect at the next start of the service
};

// A request parameter that is stored in one field of the NFS configuration record. Each API has a table of
// its settings, which serves the check, the answer and the change. CONTRIBUTING.md, "Add a parameter".
struct Setting {
  enum class Kind {
    kSwitch,                 // JSON boolean; the field is true when non-zero and written as 0 or 1
    kSwitchShownAsInteger,   // the same, but answered as the integer of the field (docs/decisions/0011)
    kInteger,                // JSON integer, without a range check (docs/decisions/0012)
    kIntegerComparedAsJson,  // the same, but compared as a JSON value (docs/decisions/0009)
  };

  const char* key;  // of the request and the answer
  Kind kind;
  int32_t NFSConfRecord::*field;
  bool SettingsChange::*effect;  // what a change of the value raises

  bool IsSwitch() const { return kind == Kind::kSwitch || kind == Kind::kSwitchShownAsInteger; }

  // Returns whether `given` has the JSON type of the setting. Null has none.
  bool Accepts(const Json::Value& given) const;

  // Returns the stored value as the answer shows it.
  Json::Value Show(const NFSConfRecord& record) const;

  // Puts the given value into the working record and raises the effect, if the value is not null and
  // differs from the stored one. Throws Json::Exception if the value cannot be converted.
  void Plan(const Json::Value& given, SettingsChange* change) const;
};

// The settings that a running service adopts without a restart. Two APIs have them.
inline constexpr Setting kLiveSettings[] = {
    {"read_size", Setting::Kind::kInteger, &NFSConfRecord::read_size, &SettingsChange::sizes_changed},
    {"write_size", Setting::Kind::kIntegerComparedAsJson, &NFSConfRecord::write_size, &SettingsChange::sizes_changed},
    {"unix_pri_enable", Setting::Kind::kSwitch, &NFSConfRecord::unix_pri_enable, &SettingsChange::permissions_changed},
};

enum class ServiceAction { kNone, kStart, kStop, kRestart };

// Returns the action that brings the service into the wanted state. A service that is to be disabled is
// stopped even if it is disabled already and only a setting changed (docs/decisions/0013).
ServiceAction DecideServiceAction(const SettingsChange& change);

// Reads or writes the whole record with the platform's operation.
bool ReadRecord(const CallSite& site, NFSConfRecord* record);
bool StoreRecord(const CallSite& site, const NFSConfRecord& record);

// Applies changed transfer sizes and UNIX permissions to the service if it is enabled and stays enabled.
bool ApplyLive(const CallSite& site, const SettingsChange& change);

// Performs the action of DecideServiceAction.
bool DriveService(const CallSite& site, const SettingsChange& change);

#endif  // VORN_SRC_SETTINGS_CHANGE_H
