// Behaviour that all ID-map methods share: the write, the reload, and the logged request.
#include "idmap.h"

#include <gmock/gmock.h>

#include <set>
#include <string>
#include <utility>

#include "entry_functions.h"
#include "expect_failure.h"
#include "fake_platform.h"

namespace {

using testing::Contains;
using testing::ElementsAre;
using testing::IsEmpty;
using testing::Not;

constexpr char kReload[] = "KLIBCExec /usr/vorn/etc/rc.sysv/S83nfsd.sh reloadidmap - - -";

struct Change {
  Entry entry;
  const char* params;
  Pairs mappings;  // what they are afterwards
};

const Change kChanges[] = {
    {NFSIDMapCreate,
     R"({"idmap": [{"kerberos_principal": "b@BOX", "local_name": "bob"}]})",
     {{"a@BOX", "alice"}, {"b@BOX", "bob"}}},
    {NFSIDMapSet, R"({"id": "a@BOX", "kerberos_principal": "b@BOX", "local_name": "bob"})", {{"b@BOX", "bob"}}},
    {NFSIDMapDelete, R"({"id": "a@BOX"})", {}},
};

TEST(NFSIDMap, WritesAndRunsNoScriptWhileTheServiceIsDisabled) {
  for (const Change& change : kChanges) {
    FakePlatform platform;
    platform.mappings = {{"a@BOX", "alice"}};
    platform.enabled = 0;
    EXPECT_EQ(Call(change.entry, change.params).code, 0) << change.params;
    EXPECT_EQ(platform.mappings, change.mappings) << change.params;
    EXPECT_THAT(platform.calls, Not(Contains(kReload))) << change.params;
  }
}

TEST(NFSIDMap, CountsAnUnknownServiceStateAsEnabled) {
  for (const Change& change : kChanges) {
    FakePlatform platform;
    platform.mappings = {{"a@BOX", "alice"}};
    platform.enabled = -1;
    EXPECT_EQ(Call(change.entry, change.params).code, 0) << change.params;
    EXPECT_THAT(platform.calls, Contains(kReload)) << change.params;
  }
}

TEST(NFSIDMap, KeepsWhatIsWrittenWhenTheReloadFails) {
  for (const Change& change : kChanges) {
    FakePlatform platform;
    platform.mappings = {{"a@BOX", "alice"}};
    platform.enabled = 1;
    platform.Fail("KLIBCExec");
    const Answer answer = Call(change.entry, change.params);
    ExpectFailure(platform, answer, change.params, 2302, "idmap", {"Failed to KLIBCExec, vornerr=[0x00AB]"});
    EXPECT_EQ(platform.mappings, change.mappings) << change.params;
  }
}

TEST(NFSIDMap, TreatsOnlyANegativeReloadResultAsFailure) {
  for (const auto& [result, code] : {std::pair{3, 0}, {-1, 2302}, {-2, 2302}}) {
    FakePlatform platform;
    platform.enabled = 1;
    platform.Fail("KLIBCExec");
    platform.FailWith("KLIBCExec", result);
    EXPECT_EQ(Call(NFSIDMapDelete, R"({"id": []})").code, code) << result;
  }
}

TEST(SaveIDMapAndReloadIDMap, HoldsTheConfigurationLockForTheWholeCall) {
  for (const char* failing : {"", "VORNNFSIDMapSet", "KLIBCExec"}) {
    FakePlatform platform;
    platform.enabled = 1;
    platform.Fail(failing);
    _tag_nfs_id_map_ record{};
    NFSIDMapServiceHandler handler(nullptr, nullptr);
    EXPECT_EQ(handler.SaveIDMapAndReloadIDMap(&record), *failing == '\0');
    EXPECT_EQ(platform.calls.front(), "VornConf") << failing;
    EXPECT_EQ(platform.calls.back(), "~VornConf") << failing;
    EXPECT_THAT(platform.live_objects, IsEmpty()) << failing;
  }
}

TEST(NFSIDMap, LogsTheParametersOfTheFirstReadWithTheLineOfTheDriver) {
  std::set<int> lines;
  for (const Entry entry : {NFSIDMapList, NFSIDMapCreate, NFSIDMapSet, NFSIDMapDelete}) {
    FakePlatform platform;
    EXPECT_EQ(Call(entry, R"({"suggestion": 1, "id": {}, "idmap": true, "x": "\n\u00e4"})").code, 2301);
    ASSERT_FALSE(platform.log.empty());
    EXPECT_EQ(platform.log.back().text, "Request: {\"id\":{},\"idmap\":true,\"suggestion\":1,\"x\":\"\\n\\u00e4\"}\n");
    EXPECT_THAT(platform.calls, ElementsAre("GetParam", "SetError"));
    lines.insert(platform.log.back().line);
  }
  EXPECT_EQ(lines.size(), 4U);
}

}  // namespace
