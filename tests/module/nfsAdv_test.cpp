#include "nfsAdv.h"

#include <gmock/gmock.h>
#include <json/value.h>

#include <cstring>
#include <string>
#include <vector>

#include "each_call.h"
#include "entry_functions.h"
#include "expect_failure.h"
#include "fake_platform.h"
#include "furnished_box.h"

namespace {

using testing::Contains;
using testing::ElementsAre;
using testing::ElementsAreArray;
using testing::IsEmpty;
using testing::Not;
using testing::StartsWith;

void FurnishRunning(FakePlatform* platform) { Furnish(platform, 1); }

// The values that a box of Furnish has already.
constexpr char kUnchanged[] = R"({"enable_nfs": true, "read_size": 8192, "write_size": 16384, "unix_pri_enable": false,
                                  "custom_port_enable": true, "statd_port": 4000, "nlm_port": 4001})";

constexpr char kEverything[] = R"({"enable_nfs": true, "read_size": 1024, "write_size": 2048, "unix_pri_enable": true,
                                   "custom_port_enable": true, "statd_port": 5000, "nlm_port": 5001})";

// Returns `params` with the given members replaced. A null member is removed.
std::string With(const char* params, const char* members) {
  Json::Value all = Parse(params);
  const Json::Value others = Parse(members);
  for (const std::string& key : others.getMemberNames()) {
    all[key] = others[key];
    if (others[key].isNull()) all.removeMember(key);
  }
  return all.toStyledString();
}

// ------------------------------------------------------------------------------------------- get

TEST(NFSAdvGet, AnswersWithTheSixSettingsOfWhichOneSwitchIsAnInteger) {
  FakePlatform platform;
  Furnish(&platform, 1);
  const Answer answer = Call(NFSAdvGet, "{}");
  EXPECT_EQ(answer.code, 0);
  EXPECT_EQ(answer.data, Parse(R"({"read_size": 8192, "write_size": 16384, "unix_pri_enable": false,
                                   "statd_port": 4000, "nlm_port": 4001, "custom_port_enable": 1})"));
  EXPECT_THAT(platform.calls, ElementsAre("VornConf", "VORNNFSConfGet", "~VornConf", "SetSuccess"));
  EXPECT_THAT(platform.log, IsEmpty());
  EXPECT_THAT(platform.live_objects, IsEmpty());
}

TEST(NFSAdvGet, AnswersAnyStoredValueAsItIs) {
  FakePlatform platform;
  platform.record.read_size = -2147483647 - 1;
  platform.record.write_size = 2147483647;
  platform.record.unix_pri_enable = -1;
  platform.record.statd_port = -1;
  platform.record.nlm_port = 70000;
  platform.record.custom_port_enable = 7;
  EXPECT_EQ(Call(NFSAdvGet, "null").data,
            Parse(R"({"read_size": -2147483648, "write_size": 2147483647, "unix_pri_enable": true,
                      "statd_port": -1, "nlm_port": 70000, "custom_port_enable": 7})"));
}

TEST(NFSAdvGet, AnswersZeroForCustomPortsThatAreOff) {
  FakePlatform platform;
  const Json::Value data = Call(NFSAdvGet, "{}").data;
  EXPECT_EQ(data["custom_port_enable"], 0);
  EXPECT_EQ(data["unix_pri_enable"], false);
}

TEST(NFSAdvGet, FailsWhenTheRecordCannotBeRead) {
  FakePlatform platform;
  platform.Fail("VORNNFSConfGet");
  const char* const params = R"({"some": "parameter"})";
  const Answer answer = Call(NFSAdvGet, params);
  ExpectFailure(platform, answer, params, 2302, "nfsAdv", {"Failed to VORNNFSConfGet."});
  EXPECT_TRUE(answer.data.isNull());
  EXPECT_THAT(platform.calls, ElementsAre("VornConf", "VORNNFSConfGet", "~VornConf", "SetError", "GetParam"));
}

TEST(NFSAdvGet, ReleasesEverythingWhenAnyCallThrows) {
  EXPECT_EQ(ExpectOnlyReleasesWhenAnyCallThrows({NFSAdvGet, "{}", FurnishRunning}), 3);
  const auto furnish_unreadable = [](FakePlatform* platform) { platform->Fail("VORNNFSConfGet"); };
  EXPECT_EQ(ExpectOnlyReleasesWhenAnyCallThrows({NFSAdvGet, "{}", furnish_unreadable}), 4);
}

// ----------------------------------------------------------------------------------------- check

struct IntegerCase {
  const char* value;      // as JSON
  const char* as_logged;  // the value as an integer; null: accepted
};

const IntegerCase kIntegerCases[] = {
    {"null", "0"},
    {"true", "1"},
    {"false", "0"},
    {"1.5", "1"},
    {"-1.5", "-1"},
    {"1e30", "0"},
    {"2147483648", "0"},
    {"-2147483649", "0"},
    {R"("8192")", "0"},
    {R"("")", "0"},
    {"18446744073709551615", "0"},
    {"[]", "0"},
    {"[8192]", "0"},
    {"{}", "0"},
    {R"({"a": 1})", "0"},
    {"0", nullptr},
    {"-1", nullptr},
    {"65536", nullptr},
    {"8192.0", nullptr},
    {"2147483647", nullptr},
    {"-2147483648", nullptr},
};

void ExpectChecked(const std::string& params, const std::string& text) {
  FakePlatform platform;
  Furnish(&platform, 1);
  const Answer answer = Call(NFSAdvSet, params);
  if (text.empty()) {
    EXPECT_EQ(answer.code, 0) << params;
    EXPECT_THAT(platform.log, IsEmpty()) << params;
    return;
  }
  ExpectFailure(platform, answer, params, 2301, "nfsAdv", {text});
  EXPECT_THAT(platform.calls, ElementsAre("GetParam", "SetError", "GetParam")) << params;
}

TEST(NFSAdvSet, RequiresAnIntegerForSizesAndUsedPorts) {
  for (const char* key : {"read_size", "write_size", "statd_port", "nlm_port"}) {
    for (const IntegerCase& c : kIntegerCases) {
      Json::Value params = Parse(kUnchanged);
      params[key] = Parse(std::string("[") + c.value + "]")[0];
      const std::string text = std::string("Invalid type of input of ") + key + ":";
      ExpectChecked(params.toStyledString(), c.as_logged == nullptr ? "" : text + c.as_logged);
    }
    Json::Value params = Parse(kUnchanged);
    params.removeMember(key);
    ExpectChecked(params.toStyledString(), std::string("Invalid type of input of ") + key + ":0");
  }
}

TEST(NFSAdvSet, RequiresABooleanForTheSwitches) {
  for (const char* key : {"unix_pri_enable", "custom_port_enable"}) {
    const std::string text = std::string("Invalid type of input of ") + key;
    for (const char* value : {"null", "0", "1", "1.0", "0.5", R"("true")", R"("")", "[]", "[true]", "{}"}) {
      Json::Value params = Parse(kUnchanged);
      params[key] = Parse(std::string("[") + value + "]")[0];
      ExpectChecked(params.toStyledString(), text);
    }
    for (const bool value : {false, true}) {
      Json::Value params = Parse(kUnchanged);
      params[key] = value;
      ExpectChecked(params.toStyledString(), "");
    }
    Json::Value params = Parse(kUnchanged);
    params.removeMember(key);
    ExpectChecked(params.toStyledString(), text);
  }
}

struct OrderCase {
  const char* params;
  const char* text;
};

TEST(NFSAdvSet, ChecksItsKeysInOrderAndStopsAtTheFirstBadOne) {
  const OrderCase cases[] = {
      {"null", "Invalid type of input of read_size:0"},
      {"{}", "Invalid type of input of read_size:0"},
      {R"({"read_size": 1})", "Invalid type of input of write_size:0"},
      {R"({"read_size": 1, "write_size": 2})", "Invalid type of input of unix_pri_enable"},
      {R"({"read_size": 1, "write_size": 2, "unix_pri_enable": true})", "Invalid type of input of custom_port_enable"},
      {R"({"read_size": 1, "write_size": 2, "unix_pri_enable": true, "custom_port_enable": true})",
       "Invalid type of input of statd_port:0"},
      {R"({"read_size": 1, "write_size": 2, "unix_pri_enable": true, "custom_port_enable": true, "statd_port": 3})",
       "Invalid type of input of nlm_port:0"},
      {R"({"read_size": 1, "write_size": 2, "unix_pri_enable": true, "custom_port_enable": true, "nlm_port": 4})",
       "Invalid type of input of statd_port:0"},
  };
  for (const OrderCase& c : cases) ExpectChecked(c.params, c.text);
}

TEST(NFSAdvSet, RequiresNoPortsWhileCustomPortsAreDisabled) {
  for (const char* members : {R"({"statd_port": null, "nlm_port": null})", R"({"statd_port": null})",
                              R"({"nlm_port": null, "unknown": []})"}) {
    ExpectChecked(With(With(kUnchanged, R"({"custom_port_enable": false})").c_str(), members), "");
  }
}

// Values that are read without a check: JsonCpp converts them or throws.
TEST(NFSAdvSet, PropagatesTheExceptionOfAnUncheckedTypeBeforeAnythingIsWritten) {
  for (const char* members :
       {R"({"enable_nfs": "true"})", R"({"enable_nfs": []})", R"({"enable_nfs": {}})",
        R"({"custom_port_enable": false, "statd_port": "5000"})", R"({"custom_port_enable": false, "nlm_port": {}})",
        R"({"custom_port_enable": false, "nlm_port": 4294967296})"}) {
    FakePlatform platform;
    Furnish(&platform, 1);
    EXPECT_THROW(Call(NFSAdvSet, With(kUnchanged, members)), Json::Exception) << members;
    EXPECT_EQ(platform.calls.back(), "~VornConf") << members;
    EXPECT_THAT(platform.calls, Not(Contains("VORNNFSConfSet"))) << members;
    EXPECT_THAT(platform.calls, Not(Contains(StartsWith("VORNNFSUDP")))) << members;
    EXPECT_THAT(platform.live_objects, IsEmpty()) << members;
  }
}

// ------------------------------------------------------------------------------------------- set

struct SetCase {
  const char* name;
  int enabled;
  const char* members;             // other than unchanged
  std::vector<std::string> steps;  // the platform's calls after the record was read and the state asked for
};

const SetCase kSetCases[] = {
    {"on stays on", 1, "{}", {"VORNNFSConfSet"}},
    {"an unknown state counts as on", -1, "{}", {"VORNNFSConfSet"}},
    {"off stays off", 0, R"({"enable_nfs": false})", {"VORNNFSConfSet"}},
    {"off stays off when nothing is said", 0, R"({"enable_nfs": null})", {"VORNNFSConfSet"}},
    {"on to off", 1, R"({"enable_nfs": false})", {"VORNNFSConfSet", "KLIBServiceStop nfsd 0"}},
    {"on to off when nothing is said", 1, R"({"enable_nfs": null})", {"VORNNFSConfSet", "KLIBServiceStop nfsd 0"}},
    {"off to on, and no firewall", 0, "{}", {"VORNNFSConfSet", "KLIBServiceStart nfsd 0"}},
    {"a number that is not 0 is on", 1, R"({"enable_nfs": 2})", {"VORNNFSConfSet"}},
    {"the number 0 is off", 1, R"({"enable_nfs": 0})", {"VORNNFSConfSet", "KLIBServiceStop nfsd 0"}},

    {"a read size goes live with the stored write size",
     1,
     R"({"read_size": 65536})",
     {"VORNNFSUDPPrefSizeSet 65536 16384", "VORNNFSConfSet"}},
    {"a write size goes live with the stored read size",
     1,
     R"({"write_size": 65536})",
     {"VORNNFSUDPPrefSizeSet 8192 65536", "VORNNFSConfSet"}},
    {"both sizes are applied in one call",
     1,
     R"({"read_size": -1, "write_size": 0})",
     {"VORNNFSUDPPrefSizeSet -1 0", "VORNNFSConfSet"}},
    {"an equal read size of another JSON type is no change", 1, R"({"read_size": 8192.0})", {"VORNNFSConfSet"}},
    {"an equal write size of another JSON type is one",
     1,
     R"({"write_size": 16384.0})",
     {"VORNNFSUDPPrefSizeSet 8192 16384", "VORNNFSConfSet"}},
    {"UNIX permissions go live", 1, R"({"unix_pri_enable": true})", {"VORNNFSUNIXPriEnableSet 1", "VORNNFSConfSet"}},
    {"sizes go live before UNIX permissions",
     1,
     R"({"read_size": 1024, "unix_pri_enable": true})",
     {"VORNNFSUDPPrefSizeSet 1024 16384", "VORNNFSUNIXPriEnableSet 1", "VORNNFSConfSet"}},
    {"nothing goes live on a service that is to start",
     0,
     R"({"read_size": 1024, "unix_pri_enable": true})",
     {"VORNNFSConfSet", "KLIBServiceStart nfsd 0"}},
    {"nothing goes live on a service that is to stop",
     1,
     R"({"enable_nfs": false, "read_size": 1024, "unix_pri_enable": true})",
     {"VORNNFSConfSet", "KLIBServiceStop nfsd 0"}},
    {"nothing goes live on a service that stays off",
     0,
     R"({"enable_nfs": false, "read_size": 1024, "unix_pri_enable": true})",
     {"VORNNFSConfSet"}},

    {"a port of the status daemon restarts",
     1,
     R"({"statd_port": 5000})",
     {"IsPortConflict nfs_statd 5000 5000", "VORNNFSConfSet", "KLIBServiceRestart nfsd", "VORNFwRuleHup"}},
    {"a port of the lock manager restarts",
     1,
     R"({"nlm_port": 5001})",
     {"IsPortConflict nfs_nlm 5001 5001", "VORNNFSConfSet", "KLIBServiceRestart nfsd", "VORNFwRuleHup"}},
    {"the platform decides about an invalid port",
     1,
     R"({"statd_port": -1, "nlm_port": 70000})",
     {"IsPortConflict nfs_statd -1 -1", "IsPortConflict nfs_nlm 70000 70000", "VORNNFSConfSet",
      "KLIBServiceRestart nfsd", "VORNFwRuleHup"}},
    {"an equal port of another JSON type is no change", 1, R"({"statd_port": 4000.0})", {"VORNNFSConfSet"}},
    {"custom ports off restart",
     1,
     R"({"custom_port_enable": false})",
     {"VORNNFSConfSet", "KLIBServiceRestart nfsd", "VORNFwRuleHup"}},
    {"custom ports off and no port given",
     1,
     R"({"custom_port_enable": false, "statd_port": null, "nlm_port": null})",
     {"VORNNFSConfSet", "KLIBServiceRestart nfsd", "VORNFwRuleHup"}},
    {"ports count while custom ports are off",
     1,
     R"({"custom_port_enable": false, "statd_port": 5000, "nlm_port": 5001})",
     {"IsPortConflict nfs_statd 5000 5000", "IsPortConflict nfs_nlm 5001 5001", "VORNNFSConfSet",
      "KLIBServiceRestart nfsd", "VORNFwRuleHup"}},
    {"a port of a service that stays off: stopped again",
     0,
     R"({"enable_nfs": false, "nlm_port": 5001})",
     {"IsPortConflict nfs_nlm 5001 5001", "VORNNFSConfSet", "KLIBServiceStop nfsd 0", "VORNFwRuleHup"}},
    {"a port of a service that is to stop",
     1,
     R"({"enable_nfs": false, "nlm_port": 5001})",
     {"IsPortConflict nfs_nlm 5001 5001", "VORNNFSConfSet", "KLIBServiceStop nfsd 0", "VORNFwRuleHup"}},
    {"a port of a service that is to start",
     0,
     R"({"statd_port": 5000})",
     {"IsPortConflict nfs_statd 5000 5000", "VORNNFSConfSet", "KLIBServiceStart nfsd 0", "VORNFwRuleHup"}},
    {"everything",
     1,
     kEverything,
     {"IsPortConflict nfs_statd 5000 5000", "IsPortConflict nfs_nlm 5001 5001", "VORNNFSUDPPrefSizeSet 1024 2048",
      "VORNNFSUNIXPriEnableSet 1", "VORNNFSConfSet", "KLIBServiceRestart nfsd", "VORNFwRuleHup"}},
};

TEST(NFSAdvSet, CallsThePlatformInOrderAndHoldsTheConfigurationLock) {
  for (const SetCase& c : kSetCases) {
    FakePlatform platform;
    Furnish(&platform, c.enabled);
    const Answer answer = Call(NFSAdvSet, With(kUnchanged, c.members));
    EXPECT_EQ(answer.code, 0) << c.name;
    EXPECT_EQ(answer.count, 1) << c.name;
    EXPECT_TRUE(answer.data.isNull()) << c.name;
    std::vector<std::string> calls{"GetParam", "VornConf", "VORNNFSConfGet", "VORNNFSConfGet",
                                   "KLIBServiceIsEnabled nfsd"};
    calls.insert(calls.end(), c.steps.begin(), c.steps.end());
    calls.insert(calls.end(), {"~VornConf", "SetSuccess"});
    EXPECT_THAT(platform.calls, ElementsAreArray(calls)) << c.name;
    EXPECT_THAT(platform.log, IsEmpty()) << c.name;
    EXPECT_THAT(platform.live_objects, IsEmpty()) << c.name;
  }
}

TEST(NFSAdvSet, ChangesOnlyItsOwnFieldsOfTheRecord) {
  FakePlatform platform;
  Furnish(&platform, 1);
  NFSConfRecord expected = platform.record;
  EXPECT_EQ(Call(NFSAdvSet, kUnchanged).code, 0);
  EXPECT_TRUE(SameRecord(platform.record, expected));

  EXPECT_EQ(Call(NFSAdvSet, With(kEverything, R"({"custom_port_enable": false})")).code, 0);
  expected.read_size = 1024;
  expected.write_size = 2048;
  expected.unix_pri_enable = 1;
  expected.statd_port = 5000;
  expected.nlm_port = 5001;
  expected.custom_port_enable = 0;
  EXPECT_TRUE(SameRecord(platform.record, expected));
}

struct SwitchCase {
  int stored;
  int written;
  bool given;
  bool changed;
};

TEST(NFSAdvSet, ReadsAnyNonZeroStoredSwitchAsOnAndWritesZeroOrOne) {
  const SwitchCase cases[] = {{0, 0, false, false}, {0, 1, true, true},    {1, 1, true, false}, {1, 0, false, true},
                              {2, 2, true, false},  {-1, -1, true, false}, {-1, 0, false, true}};
  for (const SwitchCase& c : cases) {
    FakePlatform platform;
    Furnish(&platform, 1);
    platform.record.unix_pri_enable = c.stored;
    platform.record.custom_port_enable = c.stored;
    Json::Value params = Parse(kUnchanged);
    params["unix_pri_enable"] = params["custom_port_enable"] = c.given;
    EXPECT_EQ(Call(NFSAdvSet, params.toStyledString()).code, 0);
    EXPECT_EQ(platform.record.unix_pri_enable, c.written) << c.stored << c.given;
    EXPECT_EQ(platform.record.custom_port_enable, c.written) << c.stored << c.given;
    const std::string live = "VORNNFSUNIXPriEnableSet " + std::to_string(c.written);
    const auto is_there = [&](const char* call) { return testing::Matches(Contains(call))(platform.calls); };
    EXPECT_EQ(is_there(live.c_str()), c.changed) << c.stored << c.given;
    EXPECT_EQ(is_there("KLIBServiceRestart nfsd"), c.changed) << c.stored << c.given;
  }
}

// ------------------------------------------------------------------------------------- conflicts

struct ConflictCase {
  const char* name;
  const char* members;
  std::vector<std::string> taken;
  const char* text;  // null: no conflict
};

TEST(NFSAdvSet, RefusesAChangedPortThatIsInUseAndChangesNothing) {
  const ConflictCase cases[] = {
      {"status daemon", R"({"statd_port": 5000})", {"nfs_statd 5000"}, "nfs statd port is conflict"},
      {"lock manager", R"({"nlm_port": 5001})", {"nfs_nlm 5001"}, "nfs nlm is conflict"},
      {"both: the status daemon is asked for first",
       R"({"statd_port": 5000, "nlm_port": 5001})",
       {"nfs_nlm 5001", "nfs_statd 5000"},
       "nfs statd port is conflict"},
      {"the second one of two", R"({"statd_port": 5000, "nlm_port": 5001})", {"nfs_nlm 5001"}, "nfs nlm is conflict"},
      {"custom ports off",
       R"({"custom_port_enable": false, "statd_port": 5000})",
       {"nfs_statd 5000"},
       "nfs statd port is conflict"},
      {"settings that would go live",
       R"({"read_size": 1024, "unix_pri_enable": true, "nlm_port": 5001})",
       {"nfs_nlm 5001"},
       "nfs nlm is conflict"},
      {"a service that would stop", R"({"enable_nfs": false, "nlm_port": 0})", {"nfs_nlm 0"}, "nfs nlm is conflict"},
      {"the stored ports are not tested", "{}", {"nfs_statd 4000", "nfs_nlm 4001"}, nullptr},
      {"taken for the other daemon only", R"({"statd_port": 5000})", {"nfs_nlm 5000"}, nullptr},
  };
  for (const ConflictCase& c : cases) {
    for (const int result : {1, -1}) {
      FakePlatform platform;
      Furnish(&platform, 1);
      const NFSConfRecord before = platform.record;
      platform.port_conflicts = c.taken;
      platform.FailWith("IsPortConflict", result);
      const std::string params = With(kUnchanged, c.members);
      const Answer answer = Call(NFSAdvSet, params);
      if (c.text == nullptr) {
        EXPECT_EQ(answer.code, 0) << c.name;
        continue;
      }
      ExpectFailure(platform, answer, params, 2303, "nfsAdv", {c.text});
      EXPECT_TRUE(answer.data.isNull()) << c.name;
      EXPECT_TRUE(SameRecord(platform.record, before)) << c.name;
      ASSERT_GE(platform.calls.size(), 9U) << c.name;
      EXPECT_THAT(std::vector<std::string>(platform.calls.end() - 4, platform.calls.end()),
                  ElementsAre(StartsWith("IsPortConflict"), "~VornConf", "SetError", "GetParam"))
          << c.name;
      EXPECT_THAT(platform.calls, Not(Contains(StartsWith("VORNNFSU")))) << c.name;
    }
  }
}

// -------------------------------------------------------------------------------------- failures

struct FailureCase {
  const char* name;
  const char* operation;
  int nth;
  int enabled;
  const char* members;
  const char* text;
  bool stored;
};

const FailureCase kFailures[] = {
    {"first read", "VORNNFSConfGet", 1, 1, "{}", "Failed to VORNNFSConfGet.", false},
    {"second read", "VORNNFSConfGet", 2, 1, "{}", "Failed to VORNNFSConfGet.", false},
    {"live sizes", "VORNNFSUDPPrefSizeSet", 0, 1, "{}",
     "VORNNFSUDPPrefSizeSet failed, readsize=[1024], writesize=[2048]", false},
    {"live UNIX permissions", "VORNNFSUNIXPriEnableSet", 0, 1, "{}",
     "VORNNFSUNIXPriEnableSet failed, blUNIXPriEnable=[1]", false},
    {"write", "VORNNFSConfSet", 0, 1, "{}", "Failed to VORNNFSConfSet, vornerr=[0x00AB]", false},
    {"restart", "KLIBServiceRestart", 0, 1, "{}", "failed to start service nfs", true},
    {"start", "KLIBServiceStart", 0, 0, "{}", "failed to restart service nfs", true},
    {"stop", "KLIBServiceStop", 0, 1, R"({"enable_nfs": false})", "failed to start service nfs", true},
    {"stop of a service that is off", "KLIBServiceStop", 0, 0, R"({"enable_nfs": false})",
     "failed to start service nfs", true},
};

TEST(NFSAdvSet, StopsWhereItFailsAndUndoesNothing) {
  for (const FailureCase& c : kFailures) {
    SCOPED_TRACE(c.name);
    FakePlatform platform;
    Furnish(&platform, c.enabled);
    const NFSConfRecord before = platform.record;
    platform.Fail(c.operation, c.nth);
    const std::string params = With(kEverything, c.members);
    const Answer answer = Call(NFSAdvSet, params);
    ExpectFailure(platform, answer, params, 2302, "nfsAdv", {c.text});
    EXPECT_TRUE(answer.data.isNull());
    EXPECT_EQ(!SameRecord(platform.record, before), c.stored);
    EXPECT_THAT(platform.CallsAfterFailure(), ElementsAre("~VornConf", "SetError", "GetParam"));
  }
}

TEST(NFSAdvSet, KeepsLiveSizesWhenUNIXPermissionsCannotBeApplied) {
  FakePlatform platform;
  Furnish(&platform, 1);
  platform.Fail("VORNNFSUNIXPriEnableSet");
  EXPECT_EQ(Call(NFSAdvSet, kEverything).code, 2302);
  EXPECT_THAT(platform.calls, Contains("VORNNFSUDPPrefSizeSet 1024 2048"));
  EXPECT_EQ(platform.record.read_size, 8192);
}

TEST(NFSAdvSet, SucceedsWhenTheFirewallCannotBeReloaded) {
  FakePlatform platform;
  Furnish(&platform, 1);
  platform.Fail("VORNFwRuleHup");
  const Answer answer = Call(NFSAdvSet, kEverything);
  EXPECT_EQ(answer.code, 0);
  EXPECT_TRUE(answer.data.isNull());
  EXPECT_EQ(platform.record.statd_port, 5000);
  ExpectLog(platform, "nfsAdv", {"Failed to reload firewall rules"});
  EXPECT_THAT(platform.CallsAfterFailure(), ElementsAre("~VornConf", "SetSuccess"));
}

TEST(NFSAdvSet, TreatsEveryNonZeroServiceResultAsFailure) {
  for (const char* operation : {"KLIBServiceRestart", "KLIBServiceStart", "KLIBServiceStop"}) {
    for (const int result : {1, -2}) {
      FakePlatform platform;
      Furnish(&platform, std::string(operation) == "KLIBServiceStart" ? 0 : 1);
      platform.Fail(operation);
      platform.FailWith(operation, result);
      const bool wanted = std::string(operation) != "KLIBServiceStop";
      const std::string params = With(kEverything, wanted ? "{}" : R"({"enable_nfs": false})");
      EXPECT_EQ(Call(NFSAdvSet, params).code, 2302) << operation << result;
      EXPECT_THAT(platform.calls, Not(Contains("VORNFwRuleHup"))) << operation << result;
    }
  }
}

TEST(NFSAdvSet, AnswersOnceWhenAnyCallFails) {
  EXPECT_EQ(ExpectOneAnswerWhenAnyCallFails({NFSAdvSet, kEverything, FurnishRunning}, {"VORNFwRuleHup"}), 7);
}

TEST(NFSAdvSet, ReleasesEverythingWhenAnyCallThrows) {
  EXPECT_EQ(ExpectOnlyReleasesWhenAnyCallThrows({NFSAdvSet, kEverything, FurnishRunning}), 13);
  EXPECT_EQ(ExpectOnlyReleasesWhenAnyCallThrows({NFSAdvSet, "{}", FurnishRunning}), 3);
}

TEST(NFSAdvSet, AcceptsEveryNonNegativeResult) {
  ExpectSuccessForEveryNonNegativeResult({NFSAdvSet, kEverything, FurnishRunning});
  ExpectSuccessForEveryNonNegativeResult({NFSAdvGet, "{}", FurnishRunning});
}

}  // namespace
