#include "settings_change.h"

#include <gtest/gtest.h>

#include <cstring>

#include "fake_platform.h"

namespace {

// Plans every live setting of the parameters.
void Plan(const char* params, SettingsChange* change) {
  const Json::Value given = Parse(params);
  for (const Setting& setting : kLiveSettings) setting.Plan(given[setting.key], change);
}

TEST(SettingsChange, IsEmptyInitially) {
  const SettingsChange change;
  EXPECT_FALSE(change.enabled || change.wanted);
  EXPECT_FALSE(change.sizes_changed || change.permissions_changed || change.service_affected);
  const NFSConfRecord zeros{};
  EXPECT_EQ(std::memcmp(&change.stored, &zeros, sizeof zeros), 0);
  EXPECT_EQ(std::memcmp(&change.working, &zeros, sizeof zeros), 0);
}

constexpr Setting kIntegerSwitch = {"enable_nfs_v4", Setting::Kind::kSwitchShownAsInteger,
                                    &NFSConfRecord::enable_nfs_v4, &SettingsChange::service_affected};

TEST(Setting, AcceptsItsJsonTypeAndNoOther) {
  for (const Setting& integer : {kLiveSettings[0], kLiveSettings[1]}) {
    EXPECT_FALSE(integer.IsSwitch());
    for (const char* good : {"0", "-1", "8192.0"}) EXPECT_TRUE(integer.Accepts(Parse(good))) << good;
    for (const char* bad : {"null", "true", "0.5", "4294967296", "\"1\"", "[]"}) {
      EXPECT_FALSE(integer.Accepts(Parse(bad))) << bad;
    }
  }
  for (const Setting& on_or_off : {kLiveSettings[2], kIntegerSwitch}) {
    EXPECT_TRUE(on_or_off.IsSwitch());
    for (const char* good : {"true", "false"}) EXPECT_TRUE(on_or_off.Accepts(Parse(good))) << good;
    for (const char* bad : {"null", "0", "1", "\"true\"", "[]"}) EXPECT_FALSE(on_or_off.Accepts(Parse(bad))) << bad;
  }
}

TEST(Setting, ShowsTheFieldInItsForm) {
  NFSConfRecord record{};
  record.read_size = 5;
  record.write_size = 6;
  record.unix_pri_enable = record.enable_nfs_v4 = 7;
  EXPECT_EQ(kLiveSettings[0].Show(record), Json::Value(5));
  EXPECT_EQ(kLiveSettings[1].Show(record), Json::Value(6));
  EXPECT_EQ(kLiveSettings[2].Show(record), Json::Value(true));
  EXPECT_EQ(kIntegerSwitch.Show(record), Json::Value(7));
}

TEST(Setting, RaisesItsOwnEffect) {
  SettingsChange change;
  kIntegerSwitch.Plan(Json::Value(true), &change);
  EXPECT_EQ(change.working.enable_nfs_v4, 1);
  EXPECT_TRUE(change.service_affected);
  EXPECT_FALSE(change.sizes_changed || change.permissions_changed);
}

struct ActionCase {
  bool enabled;
  bool wanted;
  bool affected;
  ServiceAction action;
};

TEST(DecideServiceAction, FollowsItsFourRules) {
  const ActionCase cases[] = {
      {false, false, false, ServiceAction::kNone}, {true, true, false, ServiceAction::kNone},
      {false, false, true, ServiceAction::kStop},  {true, false, false, ServiceAction::kStop},
      {true, false, true, ServiceAction::kStop},   {true, true, true, ServiceAction::kRestart},
      {false, true, false, ServiceAction::kStart}, {false, true, true, ServiceAction::kStart},
  };
  for (const ActionCase& c : cases) {
    SettingsChange change;
    change.enabled = c.enabled;
    change.wanted = c.wanted;
    change.service_affected = c.affected;
    EXPECT_EQ(DecideServiceAction(change), c.action) << c.enabled << c.wanted << c.affected;
  }
}

struct SizeCase {
  const char* name;
  const char* params;
  bool changed;
  int read_size;
  int write_size;
};

TEST(LiveSettings, CompareTheReadSizeByNumberAndTheWriteSizeByJsonValue) {
  const SizeCase cases[] = {
      {"nothing given", "{}", false, 4096, 8192},
      {"null is not given", R"({"read_size": null, "write_size": null})", false, 4096, 8192},
      {"equal", R"({"read_size": 4096, "write_size": 8192})", false, 4096, 8192},
      {"read size", R"({"read_size": 1024})", true, 1024, 8192},
      {"write size", R"({"write_size": 1024})", true, 4096, 1024},
      {"equal read size of another JSON type", R"({"read_size": 4096.0})", false, 4096, 8192},
      {"equal write size of another JSON type", R"({"write_size": 8192.0})", true, 4096, 8192},
  };
  for (const SizeCase& c : cases) {
    SettingsChange change;
    change.stored.read_size = 4096;
    change.stored.write_size = 8192;
    change.working = change.stored;
    Plan(c.params, &change);
    EXPECT_EQ(change.sizes_changed, c.changed) << c.name;
    EXPECT_EQ(change.working.read_size, c.read_size) << c.name;
    EXPECT_EQ(change.working.write_size, c.write_size) << c.name;
  }
}

struct SwitchCase {
  int stored;
  const char* params;
  bool changed;
  int working;
};

TEST(LiveSettings, CompareASwitchByTruthAndStoreZeroOrOne) {
  const SwitchCase cases[] = {
      {0, "{}", false, 0},
      {0, R"({"unix_pri_enable": null})", false, 0},
      {0, R"({"unix_pri_enable": true})", true, 1},
      {1, R"({"unix_pri_enable": false})", true, 0},
      {7, R"({"unix_pri_enable": true})", false, 7},
      {7, R"({"unix_pri_enable": false})", true, 0},
  };
  for (const SwitchCase& c : cases) {
    SettingsChange change;
    change.stored.unix_pri_enable = change.working.unix_pri_enable = c.stored;
    Plan(c.params, &change);
    EXPECT_EQ(change.permissions_changed, c.changed) << c.params;
    EXPECT_EQ(change.working.unix_pri_enable, c.working) << c.params;
  }
}

}  // namespace
