// The method "delete": mappings are removed by principal.
#include <gmock/gmock.h>

#include <string>
#include <vector>

#include "each_call.h"
#include "entry_functions.h"
#include "expect_failure.h"
#include "fake_platform.h"

namespace {

using testing::Contains;
using testing::ElementsAre;
using testing::ElementsAreArray;
using testing::IsEmpty;

constexpr char kMissing[] = "variable 'id' is missing.";
constexpr char kWrongType[] = "variable 'id' should be string array or string.";

constexpr char kTwo[] = R"({"id": ["a@BOX", "c@BOX"]})";

void Furnish(FakePlatform* platform) {
  platform->mappings = {{"a@BOX", "alice"}, {"b@BOX", "bob"}, {"c@BOX", "carol"}};
  platform->enabled = 1;
}

TEST(NFSIDMapDelete, RemovesTheMappingsThenWritesAndReloads) {
  FakePlatform platform;
  Furnish(&platform);
  const Answer answer = Call(NFSIDMapDelete, kTwo);
  EXPECT_EQ(answer.code, 0);
  EXPECT_TRUE(answer.data.isNull());
  EXPECT_EQ(platform.mappings, (Pairs{{"b@BOX", "bob"}}));
  EXPECT_EQ(platform.domain, "box.example");
  EXPECT_THAT(platform.calls,
              ElementsAre("GetParam", "KLIBCSzListAlloc 1024", "KLIBCSzListPush a@BOX", "KLIBCSzListPush c@BOX",
                          "VORNNFSIDMapGet", "VORNNFSStaticMapRemove", "VornConf", "VORNNFSIDMapSet /etc/idmapd.conf",
                          "KLIBServiceIsEnabled nfsd", "KLIBCExec /usr/vorn/etc/rc.sysv/S83nfsd.sh reloadidmap - - -",
                          "~VornConf", "VORNNFSIDMapFree", "KLIBCSzListFree", "SetSuccess"));
  EXPECT_THAT(platform.log, IsEmpty());
  EXPECT_THAT(platform.live_objects, IsEmpty());
}

TEST(NFSIDMapDelete, TreatsAStringLikeAnArrayOfOneString) {
  std::vector<std::vector<std::string>> calls;
  for (const char* params : {R"({"id": "a@BOX"})", R"({"id": ["a@BOX"]})"}) {
    FakePlatform platform;
    Furnish(&platform);
    EXPECT_EQ(Call(NFSIDMapDelete, params).code, 0) << params;
    EXPECT_EQ(platform.mappings, (Pairs{{"b@BOX", "bob"}, {"c@BOX", "carol"}})) << params;
    calls.push_back(platform.calls);
  }
  EXPECT_EQ(calls[0], calls[1]);
}

struct AcceptedCase {
  const char* params;
  size_t left;  // of three
};

TEST(NFSIDMapDelete, PassesUnmappedIDsToThePlatformAndAlwaysWrites) {
  const AcceptedCase cases[] = {
      {R"({"id": []})", 3},
      {R"({"id": ""})", 3},
      {R"({"id": "x"})", 3},
      {R"({"id": "A@BOX"})", 3},
      {R"({"id": ["x", "a@BOX"]})", 2},
      {R"({"id": ["a@BOX", "a@BOX"]})", 2},
      {R"({"id": ["c@BOX", "b@BOX", "a@BOX"], "foreign": 5})", 0},
  };
  for (const AcceptedCase& c : cases) {
    FakePlatform platform;
    Furnish(&platform);
    EXPECT_EQ(Call(NFSIDMapDelete, c.params).code, 0) << c.params;
    EXPECT_EQ(platform.mappings.size(), c.left) << c.params;
    EXPECT_THAT(platform.calls, Contains("VORNNFSIDMapSet /etc/idmapd.conf")) << c.params;
    EXPECT_THAT(platform.calls, Contains("KLIBCExec /usr/vorn/etc/rc.sysv/S83nfsd.sh reloadidmap - - -")) << c.params;
    EXPECT_THAT(platform.log, IsEmpty()) << c.params;
  }
}

TEST(NFSIDMapDelete, PassesOnAnIDMapWithoutTable) {
  FakePlatform platform;
  Furnish(&platform);
  platform.has_table = false;
  EXPECT_EQ(Call(NFSIDMapDelete, kTwo).code, 0);
  EXPECT_THAT(platform.calls, Contains("VORNNFSStaticMapRemove"));
  EXPECT_THAT(platform.calls, Contains("VORNNFSIDMapSet /etc/idmapd.conf"));
  EXPECT_THAT(platform.live_objects, IsEmpty());
}

// ------------------------------------------------------------------------------------- refusals

struct RefusedCase {
  const char* params;
  const char* text;
};

TEST(NFSIDMapDelete, RefusesANonStringBeforeAnyPlatformCall) {
  const RefusedCase cases[] = {
      {"null", kMissing},
      {"{}", kMissing},
      {R"({"id": null})", kMissing},
      {R"({"id": true})", kWrongType},
      {R"({"id": false})", kWrongType},
      {R"({"id": 5})", kWrongType},
      {R"({"id": 0.5})", kWrongType},
      {R"({"id": {}})", kWrongType},
      {R"({"id": {"id": "a@BOX"}})", kWrongType},
  };
  for (const RefusedCase& c : cases) {
    FakePlatform platform;
    ExpectFailure(platform, Call(NFSIDMapDelete, c.params), c.params, 2301, "idmap", {c.text});
    EXPECT_THAT(platform.calls, ElementsAre("GetParam", "SetError")) << c.params;
  }
}

TEST(NFSIDMapDelete, RemovesNothingWhenOneElementIsNotAString) {
  for (const char* params : {R"({"id": ["a@BOX", null]})", R"({"id": ["a@BOX", true]})", R"({"id": ["a@BOX", 5]})",
                             R"({"id": [0.5]})", R"({"id": [["a@BOX"]]})", R"({"id": [{}, "a@BOX"]})"}) {
    FakePlatform platform;
    Furnish(&platform);
    ExpectFailure(platform, Call(NFSIDMapDelete, params), params, 2301, "idmap", {kWrongType});
    EXPECT_THAT(platform.calls, ElementsAre("GetParam", "KLIBCSzListAlloc 1024", "KLIBCSzListFree", "SetError"))
        << params;
    EXPECT_EQ(platform.mappings.size(), 3U) << params;
  }
}

// ------------------------------------------------------------------------------------- failures

TEST(NFSIDMapDelete, SkipsAnIDThatCannotBeListed) {
  FakePlatform platform;
  Furnish(&platform);
  platform.Fail("KLIBCSzListPush", 1);
  EXPECT_EQ(Call(NFSIDMapDelete, kTwo).code, 0);
  EXPECT_EQ(platform.mappings, (Pairs{{"a@BOX", "alice"}, {"b@BOX", "bob"}}));
  ExpectLog(platform, "idmap", {"KLIBCSzListPush Failed, vornerr=[0x00AB]"});
}

TEST(NFSIDMapDelete, SucceedsEvenWhenNoIDCanBeListed) {
  FakePlatform platform;
  Furnish(&platform);
  platform.Fail("KLIBCSzListPush");
  EXPECT_EQ(Call(NFSIDMapDelete, kTwo).code, 0);
  EXPECT_EQ(platform.mappings.size(), 3U);
  EXPECT_THAT(platform.calls, Contains("VORNNFSIDMapSet /etc/idmapd.conf"));
  EXPECT_THAT(platform.LogTexts(), testing::SizeIs(2));
}

struct FailureCase {
  const char* operation;
  const char* text;
  bool written;
  std::vector<std::string> calls;  // from the last that the failing one follows
};

TEST(NFSIDMapDelete, StopsWhereItFailsAndKeepsWhatIsWritten) {
  const FailureCase failures[] = {
      {"KLIBCSzListAlloc", "KLIBCSzListAlloc Failed, vornerr=[0x00AB]", false, {}},
      {"VORNNFSIDMapGet", "Failed to VORNNFSIDMapGet, vornerr=[0x00AB]", false, {"KLIBCSzListFree"}},
      {"VORNNFSStaticMapRemove",
       "VORNNFSStaticMapRemove Failed, vornerr=[0x00AB]",
       false,
       {"VORNNFSIDMapFree", "KLIBCSzListFree"}},
      {"VORNNFSIDMapSet",
       "Failed to VORNNFSIDMapSet, vornerr=[0x00AB]",
       false,
       {"~VornConf", "VORNNFSIDMapFree", "KLIBCSzListFree"}},
      {"KLIBCExec",
       "Failed to KLIBCExec, vornerr=[0x00AB]",
       true,
       {"~VornConf", "VORNNFSIDMapFree", "KLIBCSzListFree"}},
  };
  for (const FailureCase& c : failures) {
    FakePlatform platform;
    Furnish(&platform);
    platform.Fail(c.operation);
    const Answer answer = Call(NFSIDMapDelete, kTwo);
    ExpectFailure(platform, answer, kTwo, 2302, "idmap", {c.text});
    EXPECT_TRUE(answer.data.isNull()) << c.operation;
    EXPECT_EQ(platform.mappings.size(), c.written ? 1U : 3U) << c.operation;
    std::vector<std::string> rest = c.calls;
    rest.emplace_back("SetError");
    EXPECT_THAT(platform.CallsAfterFailure(), ElementsAreArray(rest)) << c.operation;
  }
}

TEST(NFSIDMapDelete, AnswersOnceWhenAnyCallFails) {
  EXPECT_EQ(ExpectOneAnswerWhenAnyCallFails({NFSIDMapDelete, kTwo, Furnish}, {"KLIBCSzListPush"}), 7);
}

TEST(NFSIDMapDelete, ReleasesEverythingWhenAnyCallThrows) {
  EXPECT_EQ(ExpectOnlyReleasesWhenAnyCallThrows({NFSIDMapDelete, kTwo, Furnish}), 11);
  EXPECT_EQ(ExpectOnlyReleasesWhenAnyCallThrows({NFSIDMapDelete, R"({"id": ["a@BOX", 5]})", Furnish}), 3);
}

TEST(NFSIDMapDelete, AcceptsEveryNonNegativeResult) {
  ExpectSuccessForEveryNonNegativeResult({NFSIDMapDelete, kTwo, Furnish});
}

}  // namespace
