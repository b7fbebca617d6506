#include "nfs.h"

#include <gmock/gmock.h>
#include <malloc.h>

#include <cerrno>
#include <cstring>
#include <string>
#include <vector>

#include "each_call.h"
#include "entry_functions.h"
#include "expect_failure.h"
#include "fake_platform.h"
#include "furnished_box.h"
#include "nfsconf.h"

namespace {

bool g_strdup_fails = false;

}  // namespace

#pragma GCC visibility push(default)  // libraries see it too
extern "C" {

// Replaces strdup(3) in this program, the module included.
// NOLINTBEGIN(bugprone-reserved-identifier): the linker's names for what it wraps
char* __real_strdup(const char* text);

char* __wrap_strdup(const char* text) {
  if (!g_strdup_fails) return __real_strdup(text);
  errno = ENOMEM;
  return nullptr;
}
// NOLINTEND(bugprone-reserved-identifier)
}
#pragma GCC visibility pop

namespace {

using testing::ElementsAre;
using testing::ElementsAreArray;
using testing::IsEmpty;
using testing::SizeIs;

// Makes every strdup(3) fail during its lifetime.
class FailingStrdup {
 public:
  FailingStrdup() { g_strdup_fails = true; }
  ~FailingStrdup() { g_strdup_fails = false; }
  FailingStrdup(const FailingStrdup&) = delete;
  FailingStrdup& operator=(const FailingStrdup&) = delete;
};

// The data functions that no driver runs, called as a driver would call them.
void SetDataV2(VORN::APIRequest* request, VORN::APIResponse* response) {
  NFSServiceHandler handler(request, response);
  const Json::Value params = request->GetParam("", Json::Value());
  if (handler.CheckDataV2(params) && handler.SetDataV2(params)) return handler.ReportSuccess();
  handler.ReportError();
}

void GetDataV2(VORN::APIRequest* request, VORN::APIResponse* response) {
  NFSServiceHandler handler(request, response);
  Json::Value result;
  if (handler.GetDataV2(result)) return handler.ReportSuccess(result);
  handler.ReportError();
}

// ------------------------------------------------------------------------------------------- get

TEST(NFSGet, AnswersWithTheSixSettings) {
  for (const Entry entry : {NFSGet, NFSGetV2}) {
    FakePlatform platform;
    Furnish(&platform, 1);
    const Answer answer = Call(entry, "{}");
    EXPECT_EQ(answer.code, 0);
    EXPECT_EQ(answer.data, Parse(R"({"enable_nfs": true, "enable_nfs_v4": true, "nfs_v4_domain": "box.example",
                                     "read_size": 8192, "write_size": 16384, "unix_pri_enable": false})"));
    EXPECT_THAT(platform.calls,
                ElementsAre("VornConf", "VORNNFSConfGet", "VORNNFSIDMapGet", "KLIBServiceIsEnabled nfsd",
                            "VORNNFSIDMapFree", "~VornConf", "SetSuccess"));
    EXPECT_THAT(platform.live_objects, IsEmpty());
  }
}

TEST(NFSGet, CountsAnUnknownServiceStateAsEnabled) {
  FakePlatform platform;
  platform.enabled = -1;
  EXPECT_EQ(Call(NFSGet, "{}").data["enable_nfs"], true);
}

TEST(NFSGet, ReadsAnyNonZeroSwitchAsTrue) {
  FakePlatform platform;
  platform.record.enable_nfs_v4 = 2;
  platform.record.unix_pri_enable = -1;
  const Answer answer = Call(NFSGet, "{}");
  EXPECT_EQ(answer.data["enable_nfs_v4"], true);
  EXPECT_EQ(answer.data["unix_pri_enable"], true);
}

TEST(NFSGet, AnswersAnEmptyDomainIfThePlatformHasNone) {
  FakePlatform platform;
  platform.has_domain = false;
  const Answer answer = Call(NFSGet, "{}");
  EXPECT_EQ(answer.code, 0);
  EXPECT_EQ(answer.data["nfs_v4_domain"], "");
}

TEST(NFSGet, KeepsOtherMembersOfTheResult) {
  FakePlatform platform;
  Furnish(&platform);
  NFSServiceHandler handler(nullptr, nullptr);
  Json::Value result = Parse(R"({"foreign": 1, "read_size": 5})");
  EXPECT_TRUE(handler.GetData(result));
  EXPECT_EQ(result["foreign"], 1);
  EXPECT_EQ(result["read_size"], 8192);
}

TEST(GetDataV2, AnswersWithTheThreeSettingsOfNFSv4) {
  FakePlatform platform;
  Furnish(&platform);
  EXPECT_EQ(Call(GetDataV2, "{}").data,
            Parse(R"({"enable_nfs": false, "enable_nfs_v4": true, "nfs_v4_domain": "box.example"})"));
  EXPECT_THAT(platform.live_objects, IsEmpty());
}

struct GetFailure {
  const char* operation;
  const char* text;
  std::vector<std::string> calls;
};

TEST(NFSGet, FailsWithItsTextAndReleasesEverything) {
  const GetFailure failures[] = {
      {"VORNNFSConfGet", "Failed to VORNNFSConfGet.", {"VornConf", "VORNNFSConfGet", "~VornConf"}},
      {"VORNNFSIDMapGet",
       "Failed to VORNNFSIDMapGet, vornerr = [0x00AB]",
       {"VornConf", "VORNNFSConfGet", "VORNNFSIDMapGet", "~VornConf"}},
  };
  for (const Entry entry : {NFSGet, NFSGetV2}) {
    for (const GetFailure& failure : failures) {
      FakePlatform platform;
      platform.record.enable_nfs_v4 = 0;  // the ID map is read even then
      platform.Fail(failure.operation);
      const Answer answer = Call(entry, R"({"some": "parameter"})");
      EXPECT_EQ(answer.code, 2302) << failure.operation;
      EXPECT_TRUE(answer.data.isNull()) << failure.operation;
      EXPECT_THAT(platform.LogTexts(), ElementsAre(failure.text, "Request: {\"some\":\"parameter\"}\n"));
      std::vector<std::string> calls = failure.calls;
      calls.insert(calls.end(), {"SetError", "GetParam"});
      EXPECT_THAT(platform.calls, ElementsAreArray(calls)) << failure.operation;
      EXPECT_THAT(platform.live_objects, IsEmpty()) << failure.operation;
    }
  }
}

TEST(GetDataV2, ReadsInsideTheConfigurationContext) {
  FakePlatform platform;
  Call(GetDataV2, "{}");
  EXPECT_THAT(platform.calls, ElementsAre("VornConf", "VORNNFSConfGet", "VORNNFSIDMapGet", "KLIBServiceIsEnabled nfsd",
                                          "VORNNFSIDMapFree", "~VornConf", "SetSuccess"));
}

TEST(GetDataV2, FailsAsGetDataDoes) {
  for (const char* operation : {"VORNNFSConfGet", "VORNNFSIDMapGet"}) {
    FakePlatform platform;
    platform.Fail(operation);
    EXPECT_EQ(Call(GetDataV2, "{}").code, 2302) << operation;
    EXPECT_THAT(platform.log, SizeIs(1)) << operation;
    EXPECT_THAT(platform.live_objects, IsEmpty()) << operation;
  }
}

// ----------------------------------------------------------------------------------------- check

struct CheckCase {
  const char* params;
  const char* text;  // null: accepted
};

constexpr char kNoSwitch[] = "bool variable 'enable_nfs' is missing.";
constexpr char kBadType[] = "Invalid type of input.";

// Keys of version 1 only.
constexpr CheckCase kVersion1Cases[] = {
    {R"({"enable_nfs": true, "read_size": "8192"})", kBadType},
    {R"({"enable_nfs": true, "read_size": true})", kBadType},
    {R"({"enable_nfs": true, "read_size": 1.5})", kBadType},
    {R"({"enable_nfs": true, "read_size": 4294967296})", kBadType},
    {R"({"enable_nfs": true, "read_size": []})", kBadType},
    {R"({"enable_nfs": true, "read_size": {}})", kBadType},
    {R"({"enable_nfs": true, "read_size": null})", nullptr},
    {R"({"enable_nfs": true, "read_size": 8192.0})", nullptr},
    {R"({"enable_nfs": true, "read_size": -1})", nullptr},
    {R"({"enable_nfs": true, "write_size": "8192"})", kBadType},
    {R"({"enable_nfs": true, "write_size": false})", kBadType},
    {R"({"enable_nfs": true, "write_size": 1.5})", kBadType},
    {R"({"enable_nfs": true, "write_size": []})", kBadType},
    {R"({"enable_nfs": true, "write_size": {}})", kBadType},
    {R"({"enable_nfs": true, "write_size": null})", nullptr},
    {R"({"enable_nfs": true, "write_size": 0})", nullptr},
    {R"({"enable_nfs": true, "unix_pri_enable": 1})", kBadType},
    {R"({"enable_nfs": true, "unix_pri_enable": "true"})", kBadType},
    {R"({"enable_nfs": true, "unix_pri_enable": 0.5})", kBadType},
    {R"({"enable_nfs": true, "unix_pri_enable": []})", kBadType},
    {R"({"enable_nfs": true, "unix_pri_enable": {}})", kBadType},
    {R"({"enable_nfs": true, "unix_pri_enable": null})", nullptr},
    {R"({"enable_nfs": true, "unix_pri_enable": true})", nullptr},
};

constexpr CheckCase kCommonCases[] = {
    {"null", kNoSwitch},
    {"{}", kNoSwitch},
    {R"({"enable_nfs": null})", kNoSwitch},
    {R"({"enable_nfs": "true"})", kNoSwitch},
    {R"({"enable_nfs": 1})", kNoSwitch},
    {R"({"enable_nfs": 1.0})", kNoSwitch},
    {R"({"enable_nfs": []})", kNoSwitch},
    {R"({"enable_nfs": {}})", kNoSwitch},
    {R"({"enable_nfs": null, "enable_nfs_v4": 1})", kNoSwitch},
    {R"({"enable_nfs": false})", nullptr},
    {R"({"enable_nfs": true, "unknown": []})", nullptr},
    {R"({"enable_nfs": true, "enable_nfs_v4": 1})", kBadType},
    {R"({"enable_nfs": true, "enable_nfs_v4": "true"})", kBadType},
    {R"({"enable_nfs": true, "enable_nfs_v4": 0.5})", kBadType},
    {R"({"enable_nfs": true, "enable_nfs_v4": []})", kBadType},
    {R"({"enable_nfs": true, "enable_nfs_v4": {}})", kBadType},
    {R"({"enable_nfs": true, "enable_nfs_v4": null})", nullptr},
    {R"({"enable_nfs": true, "enable_nfs_v4": false})", nullptr},
    {R"({"enable_nfs": true, "nfs_v4_domain": 5})", kBadType},
    {R"({"enable_nfs": true, "nfs_v4_domain": true})", kBadType},
    {R"({"enable_nfs": true, "nfs_v4_domain": 0.5})", kBadType},
    {R"({"enable_nfs": true, "nfs_v4_domain": []})", kBadType},
    {R"({"enable_nfs": true, "nfs_v4_domain": {}})", kBadType},
    {R"({"enable_nfs": true, "nfs_v4_domain": null})", nullptr},
    {R"({"enable_nfs": true, "nfs_v4_domain": ""})", nullptr},
};

void ExpectCheck(Entry entry, const CheckCase& c) {
  FakePlatform platform;
  const Answer answer = Call(entry, c.params);
  if (c.text == nullptr) {
    EXPECT_EQ(answer.code, 0) << c.params;
    EXPECT_THAT(platform.log, IsEmpty()) << c.params;
    return;
  }
  EXPECT_EQ(answer.code, 2301) << c.params;
  ASSERT_FALSE(platform.log.empty()) << c.params;
  EXPECT_EQ(platform.log[0].text, c.text) << c.params;
  EXPECT_EQ(platform.log[0].source, "nfs") << c.params;
  EXPECT_EQ(platform.log[0].priority, 3) << c.params;
  EXPECT_THAT(platform.calls, testing::Contains("SetError"));
  EXPECT_THAT(platform.calls, testing::Not(testing::Contains("VornConf"))) << c.params;
}

TEST(NFSSet, ChecksEveryKeyBeforeAnyPlatformCall) {
  for (const Entry entry : {NFSSet, NFSSetV2}) {
    for (const CheckCase& c : kCommonCases) ExpectCheck(entry, c);
    for (const CheckCase& c : kVersion1Cases) ExpectCheck(entry, c);
  }
}

TEST(CheckDataV2, ChecksTheThreeKeysOfNFSv4) {
  for (const CheckCase& c : kCommonCases) ExpectCheck(SetDataV2, c);
  for (const CheckCase& c : kVersion1Cases) ExpectCheck(SetDataV2, {c.params, nullptr});
}

TEST(NFSSet, StopsAtTheFirstBadKey) {
  FakePlatform platform;
  Call(NFSSet, R"({"enable_nfs": 0, "enable_nfs_v4": 0, "read_size": "x"})");
  EXPECT_THAT(platform.LogTexts(), ElementsAre(kNoSwitch, testing::StartsWith("Request: ")));
  EXPECT_THAT(platform.calls, ElementsAre("GetParam", "SetError", "GetParam"));
}

// ------------------------------------------------------------------------------------------- set

struct SetCase {
  const char* name;
  int enabled;
  const char* params;
  std::vector<std::string> steps;  // the platform's calls, between VornConf and ~VornConf
};

const SetCase kSetCases[] = {
    {"on stays on", 1, R"({"enable_nfs": true})", {"VORNNFSConfGet", "KLIBServiceIsEnabled nfsd", "VORNNFSConfSet"}},
    {"off stays off", 0, R"({"enable_nfs": false})", {"VORNNFSConfGet", "KLIBServiceIsEnabled nfsd", "VORNNFSConfSet"}},
    {"an unknown state counts as on",
     -1,
     R"({"enable_nfs": true})",
     {"VORNNFSConfGet", "KLIBServiceIsEnabled nfsd", "VORNNFSConfSet"}},
    {"on to off",
     1,
     R"({"enable_nfs": false, "read_size": 1024, "unix_pri_enable": true})",
     {"VORNNFSConfGet", "KLIBServiceIsEnabled nfsd", "VORNNFSConfSet", "KLIBServiceStop nfsd 0"}},
    {"off to on, sizes to the record only",
     0,
     R"({"enable_nfs": true, "read_size": 1024, "unix_pri_enable": true})",
     {"VORNNFSConfGet", "KLIBServiceIsEnabled nfsd", "VORNNFSConfSet", "KLIBServiceStart nfsd 0"}},
    {"a new read size goes live with the stored write size",
     1,
     R"({"enable_nfs": true, "read_size": 65536})",
     {"VORNNFSConfGet", "KLIBServiceIsEnabled nfsd", "VORNNFSConfSet", "VORNNFSUDPPrefSizeSet 65536 16384"}},
    {"a new write size goes live with the stored read size",
     1,
     R"({"enable_nfs": true, "write_size": 65536})",
     {"VORNNFSConfGet", "KLIBServiceIsEnabled nfsd", "VORNNFSConfSet", "VORNNFSUDPPrefSizeSet 8192 65536"}},
    {"an equal number of another JSON type is a change of the write size, but not of the read size",
     1,
     R"({"enable_nfs": true, "read_size": 8192.0, "write_size": 16384.0})",
     {"VORNNFSConfGet", "KLIBServiceIsEnabled nfsd", "VORNNFSConfSet", "VORNNFSUDPPrefSizeSet 8192 16384"}},
    {"the UNIX-permission switch goes live",
     1,
     R"({"enable_nfs": true, "unix_pri_enable": true})",
     {"VORNNFSConfGet", "KLIBServiceIsEnabled nfsd", "VORNNFSConfSet", "VORNNFSUNIXPriEnableSet 1"}},
    {"equal values change nothing",
     1,
     R"({"enable_nfs": true, "read_size": 8192, "write_size": 16384, "unix_pri_enable": false, "enable_nfs_v4": true})",
     {"VORNNFSConfGet", "KLIBServiceIsEnabled nfsd", "VORNNFSConfSet"}},
    {"live settings come before a restart",
     1,
     R"({"enable_nfs": true, "enable_nfs_v4": false, "write_size": 1024, "unix_pri_enable": true})",
     {"VORNNFSConfGet", "KLIBServiceIsEnabled nfsd", "VORNNFSConfSet", "VORNNFSUDPPrefSizeSet 8192 1024",
      "VORNNFSUNIXPriEnableSet 1", "KLIBServiceRestart nfsd"}},
    {"off stays off with another NFSv4 switch: stopped again",
     0,
     R"({"enable_nfs": false, "enable_nfs_v4": false})",
     {"VORNNFSConfGet", "KLIBServiceIsEnabled nfsd", "VORNNFSConfSet", "KLIBServiceStop nfsd 0"}},
    {"a domain is ignored when NFSv4 goes off",
     1,
     R"({"enable_nfs": true, "enable_nfs_v4": false, "nfs_v4_domain": "new.example"})",
     {"VORNNFSConfGet", "KLIBServiceIsEnabled nfsd", "VORNNFSConfSet", "KLIBServiceRestart nfsd"}},
    {"an equal domain is not written",
     1,
     R"({"enable_nfs": true, "nfs_v4_domain": "box.example"})",
     {"VORNNFSConfGet", "KLIBServiceIsEnabled nfsd", "VORNNFSIDMapGet", "VORNNFSConfSet", "VORNNFSIDMapFree"}},
    {"a null domain is not given",
     1,
     R"({"enable_nfs": true, "nfs_v4_domain": null})",
     {"VORNNFSConfGet", "KLIBServiceIsEnabled nfsd", "VORNNFSConfSet"}},
    {"a domain that differs by case is new",
     1,
     R"({"enable_nfs": true, "nfs_v4_domain": "Box.example"})",
     {"VORNNFSConfGet", "KLIBServiceIsEnabled nfsd", "VORNNFSIDMapGet", "VORNNFSIDMapSet /etc/idmapd.conf",
      "VORNNFSConfSet", "KLIBServiceRestart nfsd", "VORNNFSIDMapFree"}},
    {"the empty domain is a domain",
     1,
     R"({"enable_nfs": true, "nfs_v4_domain": ""})",
     {"VORNNFSConfGet", "KLIBServiceIsEnabled nfsd", "VORNNFSIDMapGet", "VORNNFSIDMapSet /etc/idmapd.conf",
      "VORNNFSConfSet", "KLIBServiceRestart nfsd", "VORNNFSIDMapFree"}},
    {"off stays off with another domain: stopped again",
     0,
     R"({"enable_nfs": false, "nfs_v4_domain": "new.example"})",
     {"VORNNFSConfGet", "KLIBServiceIsEnabled nfsd", "VORNNFSIDMapGet", "VORNNFSIDMapSet /etc/idmapd.conf",
      "VORNNFSConfSet", "KLIBServiceStop nfsd 0", "VORNNFSIDMapFree"}},
};

TEST(NFSSet, CallsThePlatformInOrderAndHoldsTheConfigurationLock) {
  for (const Entry entry : {NFSSet, NFSSetV2}) {
    for (const SetCase& c : kSetCases) {
      FakePlatform platform;
      Furnish(&platform, c.enabled);
      const Answer answer = Call(entry, c.params);
      EXPECT_EQ(answer.code, 0) << c.name;
      EXPECT_TRUE(answer.data.isNull()) << c.name;
      EXPECT_EQ(answer.count, 1) << c.name;
      std::vector<std::string> calls{"GetParam", "VornConf"};
      calls.insert(calls.end(), c.steps.begin(), c.steps.end());
      calls.insert(calls.end(), {"~VornConf", "SetSuccess"});
      EXPECT_THAT(platform.calls, ElementsAreArray(calls)) << c.name;
      EXPECT_THAT(platform.log, IsEmpty()) << c.name;
      EXPECT_THAT(platform.live_objects, IsEmpty()) << c.name;
    }
  }
}

TEST(NFSSet, IgnoresADomainWhileNFSv4IsDisabled) {
  FakePlatform platform;
  Call(NFSSet, R"({"enable_nfs": false, "nfs_v4_domain": "new.example"})");
  EXPECT_EQ(platform.domain, "box.example");
  EXPECT_THAT(platform.calls, testing::Not(testing::Contains("VORNNFSIDMapGet")));
}

TEST(NFSSet, StoresADomainWhenNFSv4IsBeingEnabled) {
  FakePlatform platform;
  platform.mappings = {{"alice@BOX", "alice"}};
  Call(NFSSet, R"({"enable_nfs": true, "enable_nfs_v4": true, "nfs_v4_domain": "new.example"})");
  EXPECT_EQ(platform.domain, "new.example");
  EXPECT_EQ(platform.mappings, (Pairs{{"alice@BOX", "alice"}}));
  EXPECT_EQ(platform.record.enable_nfs_v4, 1);
}

TEST(NFSSet, ChangesOnlyItsOwnFieldsOfTheRecord) {
  FakePlatform platform;
  Furnish(&platform, 1);
  const NFSConfRecord before = platform.record;
  Call(NFSSet, R"({"enable_nfs": true})");
  EXPECT_TRUE(SameRecord(platform.record, before));

  Call(NFSSet,
       R"({"enable_nfs": true, "enable_nfs_v4": false, "read_size": 1, "write_size": 2, "unix_pri_enable": true})");
  NFSConfRecord expected = before;
  expected.enable_nfs_v4 = 0;
  expected.read_size = 1;
  expected.write_size = 2;
  expected.unix_pri_enable = 1;
  EXPECT_TRUE(SameRecord(platform.record, expected));
}

TEST(NFSSet, ReadsAnyNonZeroStoredSwitchAsTrue) {
  FakePlatform platform;
  platform.record.enable_nfs_v4 = 2;
  platform.record.unix_pri_enable = 2;
  platform.enabled = 1;
  Call(NFSSet, R"({"enable_nfs": true, "enable_nfs_v4": true, "unix_pri_enable": true})");
  EXPECT_EQ(platform.record.enable_nfs_v4, 2) << "unchanged, so not written as 1";
  EXPECT_THAT(platform.calls, testing::Not(testing::Contains("KLIBServiceRestart nfsd")));
}

TEST(NFSSet, DiffersBetweenVersionsOnlyInTheLineOfTheLoggedRequest) {
  FakePlatform platform;
  Call(NFSSet, "{}");
  Call(NFSSetV2, "{}");
  ASSERT_EQ(platform.log.size(), 4U);
  EXPECT_EQ(platform.log[1].text, platform.log[3].text);
  EXPECT_EQ(platform.log[1].source, "nfs");
  EXPECT_NE(platform.log[1].line, platform.log[3].line);
}

struct SetFailure {
  const char* name;
  int enabled;
  const char* params;
  const char* operation;
  const char* text;
  std::vector<std::string> written;  // of "domain", "record"
};

constexpr char kEverything[] = R"({"enable_nfs": true, "enable_nfs_v4": false, "nfs_v4_domain": "x",
                                   "read_size": 1024, "write_size": 2048, "unix_pri_enable": true})";
constexpr char kDomainAndSizes[] = R"({"enable_nfs": true, "nfs_v4_domain": "new.example", "read_size": 1024,
                                       "unix_pri_enable": true})";

const SetFailure kSetFailures[] = {
    {"record read", 1, kEverything, "VORNNFSConfGet", "Failed to VORNNFSConfGet.", {}},
    {"ID map read", 1, kDomainAndSizes, "VORNNFSIDMapGet", "Failed to VORNNFSIDMapGet, vornerr=[0x00AB]", {}},
    {"ID map write", 1, kDomainAndSizes, "VORNNFSIDMapSet", "Failed to VORNNFSIDMapSet, vornerr=[0x00AB]", {}},
    {"record write", 1, kDomainAndSizes, "VORNNFSConfSet", "Failed to VORNNFSConfSet, vornerr=[0x00AB]", {"domain"}},
    {"live sizes",
     1,
     kDomainAndSizes,
     "VORNNFSUDPPrefSizeSet",
     "VORNNFSUDPPrefSizeSet failed, readsize=[1024], writesize=[16384]",
     {"domain", "record"}},
    {"live UNIX permissions",
     1,
     kDomainAndSizes,
     "VORNNFSUNIXPriEnableSet",
     "VORNNFSUNIXPriEnableSet failed, blUNIXPriEnable=[1]",
     {"domain", "record"}},
    {"restart", 1, kDomainAndSizes, "KLIBServiceRestart", "failed to start service nfs", {"domain", "record"}},
    {"start", 0, kDomainAndSizes, "KLIBServiceStart", "failed to restart service nfs", {"domain", "record"}},
    {"stop",
     1,
     R"({"enable_nfs": false, "nfs_v4_domain": "new.example", "read_size": 1024})",
     "KLIBServiceStop",
     "failed to start service nfs",
     {"domain", "record"}},
};

TEST(NFSSet, StopsWhereItFailsAndKeepsWhatIsWritten) {
  for (const Entry entry : {NFSSet, NFSSetV2}) {
    for (const SetFailure& failure : kSetFailures) {
      FakePlatform platform;
      Furnish(&platform, failure.enabled);
      const NFSConfRecord before = platform.record;
      platform.Fail(failure.operation);
      const Answer answer = Call(entry, failure.params);

      EXPECT_EQ(answer.code, 2302) << failure.name;
      EXPECT_EQ(answer.count, 1) << failure.name;
      EXPECT_THAT(platform.LogTexts(), ElementsAre(failure.text, testing::StartsWith("Request: {"))) << failure.name;
      std::vector<std::string> written;
      if (platform.domain != "box.example") written.emplace_back("domain");
      if (!SameRecord(platform.record, before)) written.emplace_back("record");
      EXPECT_EQ(written, failure.written) << failure.name;
      EXPECT_THAT(platform.live_objects, IsEmpty()) << failure.name;

      // After the failing call there are only releases, the answer and the log.
      auto call = platform.calls.begin();
      while (call->rfind(failure.operation, 0) != 0) ++call;
      for (++call; call != platform.calls.end(); ++call) {
        EXPECT_THAT(*call, testing::AnyOf("VORNNFSIDMapFree", "~VornConf", "SetError", "GetParam")) << failure.name;
      }
    }
  }
}

TEST(NFSSet, TreatsEveryNonZeroServiceResultAsFailure) {
  for (const int result : {1, -2}) {
    FakePlatform platform;
    platform.Fail("KLIBServiceStart");
    platform.FailWith("KLIBServiceStart", result);
    EXPECT_EQ(Call(NFSSet, R"({"enable_nfs": true})").code, 2302) << result;
  }
}

TEST(NFSSet, RefusesAnIDMapWithoutDomain) {
  FakePlatform platform;
  Furnish(&platform, 1);
  platform.has_domain = false;
  EXPECT_EQ(Call(NFSSet, R"({"enable_nfs": true, "nfs_v4_domain": "new.example"})").code, 2302);
  EXPECT_EQ(platform.log[0].text, "szDomain should not be NULL");
  EXPECT_THAT(platform.live_objects, IsEmpty());
  EXPECT_THAT(platform.calls, testing::Not(testing::Contains("VORNNFSConfSet")));
}

TEST(NFSSet, FailsWithoutMemoryForTheDomainAndKeepsTheOldOne) {
  FakePlatform platform;
  Furnish(&platform, 1);
  const FailingStrdup failing;
  ExpectFailure(platform, Call(NFSSet, kDomainAndSizes), kDomainAndSizes, 2302, "nfs",
                {"Failed to strdup: Cannot allocate memory"});
  EXPECT_THAT(platform.CallsAfterFailure(), testing::Not(testing::Contains(testing::StartsWith("VORNNFSIDMapSet"))));
  EXPECT_EQ(platform.domain, "box.example");
}

TEST(NFSSet, FreesTheReplacedDomain) {
  constexpr size_t kLength = 64 << 10;
  constexpr size_t kTimes = 100;
  const size_t before = mallinfo2().uordblks;
  for (size_t n = 0; n < kTimes; ++n) {
    FakePlatform platform;
    Furnish(&platform, 1);
    platform.domain = std::string(kLength, 'd');
    EXPECT_EQ(Call(NFSSet, kDomainAndSizes).code, 0);
  }
  EXPECT_LT(mallinfo2().uordblks, before + kTimes * kLength / 2);
}

TEST(NFSSet, ReleasesEverythingWhenAnyCallFails) {
  for (const char* params : {kEverything, kDomainAndSizes}) {
    int failed = 0;
    for (int n = 1;; ++n) {
      FakePlatform platform;
      Furnish(&platform, 1);
      platform.FailCall(n);
      const Answer answer = Call(NFSSet, params);
      if (platform.failed_calls.empty()) break;
      ++failed;
      EXPECT_EQ(answer.code, 2302) << platform.failed_calls[0];
      EXPECT_EQ(answer.count, 1) << platform.failed_calls[0];
      EXPECT_THAT(platform.live_objects, IsEmpty()) << platform.failed_calls[0];
    }
    EXPECT_GE(failed, 5);
  }
}

TEST(NFSSet, ReleasesEverythingWhenAnyCallThrows) {
  for (const char* operation : {"VORNNFSConfGet", "KLIBServiceIsEnabled", "VORNNFSIDMapGet", "VORNNFSIDMapSet",
                                "VORNNFSConfSet", "VORNNFSUDPPrefSizeSet", "KLIBServiceRestart"}) {
    FakePlatform platform;
    Furnish(&platform, 1);
    platform.Throw(operation);
    EXPECT_THROW(Call(NFSSet, kDomainAndSizes), std::runtime_error) << operation;
    EXPECT_THAT(platform.live_objects, IsEmpty()) << operation;
    EXPECT_THAT(platform.calls, testing::Not(testing::Contains("SetError"))) << operation;
  }
}

TEST(NFSSet, AcceptsEveryNonNegativeResult) {
  const auto furnish = [](FakePlatform* platform) { Furnish(platform, 1); };
  for (const char* params : {kEverything, kDomainAndSizes})
    ExpectSuccessForEveryNonNegativeResult({NFSSet, params, furnish});
  ExpectSuccessForEveryNonNegativeResult({NFSGet, "{}", furnish});
}

// ---------------------------------------------------------------------------- set, NFSv4 alone

TEST(SetDataV2, ReadsBothCopiesAndNeitherSizesNorPermissions) {
  FakePlatform platform;
  Furnish(&platform, 1);
  const NFSConfRecord before = platform.record;
  const Answer answer = Call(SetDataV2, kDomainAndSizes);
  EXPECT_EQ(answer.code, 0);
  EXPECT_THAT(platform.calls,
              ElementsAre("GetParam", "VornConf", "VORNNFSConfGet", "VORNNFSConfGet", "KLIBServiceIsEnabled nfsd",
                          "VORNNFSIDMapGet", "VORNNFSIDMapSet /etc/idmapd.conf", "VORNNFSConfSet",
                          "KLIBServiceRestart nfsd", "VORNNFSIDMapFree", "~VornConf", "SetSuccess"));
  EXPECT_TRUE(SameRecord(platform.record, before)) << "sizes and permissions are not its keys";
  EXPECT_EQ(platform.domain, "new.example");
}

TEST(SetDataV2, ChangesTheNFSv4Switch) {
  FakePlatform platform;
  Furnish(&platform, 1);
  EXPECT_EQ(Call(SetDataV2, R"({"enable_nfs": true, "enable_nfs_v4": false, "read_size": 1})").code, 0);
  EXPECT_EQ(platform.record.enable_nfs_v4, 0);
  EXPECT_EQ(platform.record.read_size, 8192);
}

TEST(SetDataV2, FailsIfEitherCopyCannotBeRead) {
  for (const int nth : {1, 2}) {
    FakePlatform platform;
    Furnish(&platform, 1);
    platform.Fail("VORNNFSConfGet", nth);
    EXPECT_EQ(Call(SetDataV2, kDomainAndSizes).code, 2302);
    EXPECT_THAT(platform.LogTexts(), ElementsAre("Failed to VORNNFSConfGet."));
    EXPECT_EQ(std::count(platform.calls.begin(), platform.calls.end(), "VORNNFSConfGet"), nth);
    EXPECT_THAT(platform.calls, testing::Not(testing::Contains("KLIBServiceIsEnabled nfsd")));
    EXPECT_THAT(platform.live_objects, IsEmpty());
  }
}

TEST(SetDataV2, FailsWithTheTextsOfSetData) {
  for (const SetFailure& failure : kSetFailures) {
    if (std::string(failure.name).find("live") != std::string::npos) continue;
    FakePlatform platform;
    Furnish(&platform, failure.enabled);
    platform.Fail(failure.operation);
    EXPECT_EQ(Call(SetDataV2, failure.params).code, 2302) << failure.name;
    EXPECT_THAT(platform.LogTexts(), ElementsAre(failure.text)) << failure.name;
    EXPECT_THAT(platform.live_objects, IsEmpty()) << failure.name;
  }
}

}  // namespace
