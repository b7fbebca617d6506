#include "settings_change.h"

#include <gtest/gtest.h>

#include <cstring>

#include "fake_platform.h"

namespace {

TEST(SettingsChange, BeginsAsNone) {
  const SettingsChange change;
  EXPECT_FALSE(change.enabled || change.wanted);
  EXPECT_FALSE(change.sizes_changed || change.permissions_changed || change.service_affected);
  const NFSConfRecord zeros{};
  EXPECT_EQ(std::memcmp(&change.stored, &zeros, sizeof zeros), 0);
  EXPECT_EQ(std::memcmp(&change.working, &zeros, sizeof zeros), 0);
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

TEST(PlanTransferSizes, ComparesTheReadSizeByNumberAndTheWriteSizeByJsonValue) {
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
    PlanTransferSizes(Parse(c.params), &change);
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

TEST(PlanUNIXPermissions, ComparesTruthAndStoresZeroOrOne) {
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
    PlanUNIXPermissions(Parse(c.params), &change);
    EXPECT_EQ(change.permissions_changed, c.changed) << c.params;
    EXPECT_EQ(change.working.unix_pri_enable, c.working) << c.params;
  }
}

}  // namespace
