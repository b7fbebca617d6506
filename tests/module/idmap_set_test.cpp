// The method "set": one mapping replaces another.
#include <gmock/gmock.h>

#include <string>
#include <vector>

#include "each_call.h"
#include "entry_functions.h"
#include "expect_failure.h"
#include "fake_platform.h"

namespace {

using testing::ElementsAre;
using testing::ElementsAreArray;
using testing::IsEmpty;
using testing::StartsWith;

constexpr char kMissing[] = "string variable 'id', 'kerberos_principal', or 'local_name' are missing.";
constexpr char kNotRemoved[] = "remove old principal id failed.";
constexpr char kConflict[] = "new principal conflict.";
constexpr char kNoUser[] = "'local_name' should be local user.";

constexpr char kReplace[] = R"({"id": "a@BOX", "kerberos_principal": "b@BOX", "local_name": "bob"})";

void Furnish(FakePlatform* platform) {
  platform->mappings = {{"a@BOX", "alice"}, {"c@BOX", "carol"}};
  platform->enabled = 1;
}

TEST(NFSIDMapSet, ReplacesWritesAndReloadsTheMapping) {
  FakePlatform platform;
  Furnish(&platform);
  const Answer answer = Call(NFSIDMapSet, kReplace);
  EXPECT_EQ(answer.code, 0);
  EXPECT_TRUE(answer.data.isNull());
  EXPECT_EQ(platform.mappings, (Pairs{{"c@BOX", "carol"}, {"b@BOX", "bob"}}));
  EXPECT_EQ(platform.domain, "box.example");
  EXPECT_THAT(platform.calls,
              ElementsAre("GetParam", "VORNNFSIDMapGet", "KLIBCSzHashRemoveKey a@BOX", "KLIBCSzHashGetValue b@BOX",
                          "KLIBCSzListAlloc 1024", "VORNUserEnum 1", "KLIBCSzListFind bob",
                          "KLIBCSzHashSetValue b@BOX bob", "VornConf", "VORNNFSIDMapSet /etc/idmapd.conf",
                          "KLIBServiceIsEnabled nfsd", "KLIBCExec /usr/vorn/etc/rc.sysv/S83nfsd.sh reloadidmap - - -",
                          "~VornConf", "KLIBCSzListFree", "VORNNFSIDMapFree", "SetSuccess"));
  EXPECT_THAT(platform.log, IsEmpty());
  EXPECT_THAT(platform.live_objects, IsEmpty());
}

struct AcceptedCase {
  const char* name;
  const char* params;
  Pairs mappings;
};

TEST(NFSIDMapSet, AcceptsEveryMappingThatLeavesNoConflict) {
  const AcceptedCase cases[] = {
      {"the same principal for another user",
       R"({"id": "a@BOX", "kerberos_principal": "a@BOX", "local_name": "bob"})",
       {{"c@BOX", "carol"}, {"", "alice"}, {"a@BOX", "bob"}}},
      {"the same mapping once more",
       R"({"id": "a@BOX", "kerberos_principal": "a@BOX", "local_name": "alice"})",
       {{"c@BOX", "carol"}, {"", "alice"}, {"a@BOX", "alice"}}},
      {"an empty id, if that is mapped",
       R"({"id": "", "kerberos_principal": "b@BOX", "local_name": "bob"})",
       {{"a@BOX", "alice"}, {"c@BOX", "carol"}, {"b@BOX", "bob"}}},
      {"root, whom no enumeration returns",
       R"({"id": "a@BOX", "kerberos_principal": "b@BOX", "local_name": "root"})",
       {{"c@BOX", "carol"}, {"", "alice"}, {"b@BOX", "root"}}},
      {"a user with an equals sign",
       R"({"id": "a@BOX", "kerberos_principal": "b@BOX", "local_name": "x=y"})",
       {{"c@BOX", "carol"}, {"", "alice"}, {"b@BOX", "x=y"}}},
      {"a principal that differs from another one by case",
       R"({"id": "a@BOX", "kerberos_principal": "C@BOX", "local_name": "carol"})",
       {{"c@BOX", "carol"}, {"", "alice"}, {"C@BOX", "carol"}}},
      {"a foreign key",
       R"({"id": "a@BOX", "kerberos_principal": "b@BOX", "local_name": "bob", "idmap": 5})",
       {{"c@BOX", "carol"}, {"", "alice"}, {"b@BOX", "bob"}}},
  };
  for (const AcceptedCase& c : cases) {
    FakePlatform platform;
    Furnish(&platform);
    platform.mappings.emplace_back("", "alice");
    platform.users.emplace_back("x=y");
    EXPECT_EQ(Call(NFSIDMapSet, c.params).code, 0) << c.name;
    EXPECT_EQ(platform.mappings, c.mappings) << c.name;
    EXPECT_THAT(platform.log, IsEmpty()) << c.name;
  }
}

// ---------------------------------------------------------------------------------------- check

struct TextCase {
  const char* value;
  bool accepted_as_id;
};

TEST(NFSIDMapSet, AcceptsOnlyStringsOfWhichOnlyTheIDMayBeEmpty) {
  const TextCase values[] = {{"null", false}, {"true", false}, {"5", false},        {"0.5", false},
                             {"[]", false},   {"{}", false},   {R"(["x"])", false}, {R"("")", true}};
  for (const char* key : {"id", "kerberos_principal", "local_name"}) {
    for (const TextCase& c : values) {
      if (c.accepted_as_id && std::string(key) == "id") continue;
      FakePlatform platform;
      Furnish(&platform);
      Json::Value params = Parse(kReplace);
      params[key] = Parse(std::string("[") + c.value + "]")[0];
      const std::string text = params.toStyledString();
      ExpectFailure(platform, Call(NFSIDMapSet, text), text, 2301, "idmap", {kMissing});
      EXPECT_THAT(platform.calls, ElementsAre("GetParam", "SetError")) << text;
    }
  }
}

TEST(NFSIDMapSet, RequiresAllThreeKeys) {
  for (const char* params :
       {"null", "{}", R"({"kerberos_principal": "b@BOX", "local_name": "bob"})",
        R"({"id": "a@BOX", "local_name": "bob"})", R"({"id": "a@BOX", "kerberos_principal": "b@BOX"})"}) {
    FakePlatform platform;
    ExpectFailure(platform, Call(NFSIDMapSet, params), params, 2301, "idmap", {kMissing});
    EXPECT_THAT(platform.calls, ElementsAre("GetParam", "SetError")) << params;
  }
}

struct RefusedCase {
  const char* name;
  const char* params;
  int code;
  const char* text;
  std::vector<std::string> calls;  // between the parameters and the answer
};

const RefusedCase kRefusedCases[] = {
    {"an equals sign",
     R"({"id": "a@BOX", "kerberos_principal": "b=c@BOX", "local_name": "bob"})",
     2353,
     R"(KERBEROS_PRINCIPAL:b=c@BOX contains invalid symbol "=")",
     {}},
    {"an equals sign before all that is wrong besides",
     R"({"id": "x", "kerberos_principal": "=", "local_name": "dave"})",
     2353,
     R"(KERBEROS_PRINCIPAL:= contains invalid symbol "=")",
     {}},
    {"an old mapping that is not there",
     R"({"id": "b@BOX", "kerberos_principal": "b@BOX", "local_name": "bob"})",
     2302,
     kNotRemoved,
     {"VORNNFSIDMapGet", "KLIBCSzHashRemoveKey b@BOX", "VORNNFSIDMapFree"}},
    {"an empty id that is not mapped",
     R"({"id": "", "kerberos_principal": "b@BOX", "local_name": "bob"})",
     2302,
     kNotRemoved,
     {"VORNNFSIDMapGet", "KLIBCSzHashRemoveKey", "VORNNFSIDMapFree"}},
    {"an old mapping that is not there before a conflict",
     R"({"id": "b@BOX", "kerberos_principal": "c@BOX", "local_name": "dave"})",
     2302,
     kNotRemoved,
     {"VORNNFSIDMapGet", "KLIBCSzHashRemoveKey b@BOX", "VORNNFSIDMapFree"}},
    {"a principal that is mapped",
     R"({"id": "a@BOX", "kerberos_principal": "c@BOX", "local_name": "bob"})",
     2351,
     kConflict,
     {"VORNNFSIDMapGet", "KLIBCSzHashRemoveKey a@BOX", "KLIBCSzHashGetValue c@BOX", "VORNNFSIDMapFree"}},
    {"a conflict before an unknown user",
     R"({"id": "a@BOX", "kerberos_principal": "c@BOX", "local_name": "dave"})",
     2351,
     kConflict,
     {"VORNNFSIDMapGet", "KLIBCSzHashRemoveKey a@BOX", "KLIBCSzHashGetValue c@BOX", "VORNNFSIDMapFree"}},
    {"an unknown user",
     R"({"id": "a@BOX", "kerberos_principal": "b@BOX", "local_name": "dave"})",
     2352,
     kNoUser,
     {"VORNNFSIDMapGet", "KLIBCSzHashRemoveKey a@BOX", "KLIBCSzHashGetValue b@BOX", "KLIBCSzListAlloc 1024",
      "VORNUserEnum 1", "KLIBCSzListFind dave", "KLIBCSzListFree", "VORNNFSIDMapFree"}},
    {"root in capitals",
     R"({"id": "a@BOX", "kerberos_principal": "b@BOX", "local_name": "Root"})",
     2352,
     kNoUser,
     {"VORNNFSIDMapGet", "KLIBCSzHashRemoveKey a@BOX", "KLIBCSzHashGetValue b@BOX", "KLIBCSzListAlloc 1024",
      "VORNUserEnum 1", "KLIBCSzListFind Root", "KLIBCSzListFree", "VORNNFSIDMapFree"}},
};

TEST(NFSIDMapSet, ChecksInItsOrderAndWritesNothing) {
  for (const RefusedCase& c : kRefusedCases) {
    FakePlatform platform;
    Furnish(&platform);
    const Pairs before = platform.mappings;
    const Answer answer = Call(NFSIDMapSet, c.params);
    ExpectFailure(platform, answer, c.params, c.code, "idmap", {c.text});
    EXPECT_TRUE(answer.data.isNull()) << c.name;
    EXPECT_EQ(platform.mappings, before) << c.name;
    std::vector<std::string> calls{"GetParam"};
    calls.insert(calls.end(), c.calls.begin(), c.calls.end());
    calls.emplace_back("SetError");
    EXPECT_THAT(platform.calls, ElementsAreArray(calls)) << c.name;
  }
}

// ------------------------------------------------------------------------------------- failures

struct FailureCase {
  const char* operation;
  const char* text;
  bool written;
  std::vector<std::string> last_calls;  // the failing one and what follows
};

TEST(NFSIDMapSet, StopsWhereItFailsAndKeepsWhatIsWritten) {
  const FailureCase failures[] = {
      {"VORNNFSIDMapGet",
       "Failed to VORNNFSIDMapGet, vornerr=[0x00AB]",
       false,
       {"GetParam", "VORNNFSIDMapGet", "SetError"}},
      {"KLIBCSzHashRemoveKey", kNotRemoved, false, {"KLIBCSzHashRemoveKey a@BOX", "VORNNFSIDMapFree", "SetError"}},
      {"KLIBCSzListAlloc",
       "Failed to KLIBCSzListAlloc.",
       false,
       {"KLIBCSzListAlloc 1024", "VORNNFSIDMapFree", "SetError"}},
      {"VORNUserEnum",
       "Failed to VORNUserEnum.",
       false,
       {"VORNUserEnum 1", "KLIBCSzListFree", "VORNNFSIDMapFree", "SetError"}},
      {"KLIBCSzHashSetValue",
       "failed to add principal.",
       false,
       {"KLIBCSzHashSetValue b@BOX bob", "KLIBCSzListFree", "VORNNFSIDMapFree", "SetError"}},
      {"VORNNFSIDMapSet",
       "Failed to VORNNFSIDMapSet, vornerr=[0x00AB]",
       false,
       {"VornConf", "VORNNFSIDMapSet /etc/idmapd.conf", "~VornConf", "KLIBCSzListFree", "VORNNFSIDMapFree",
        "SetError"}},
      {"KLIBCExec",
       "Failed to KLIBCExec, vornerr=[0x00AB]",
       true,
       {"KLIBCExec /usr/vorn/etc/rc.sysv/S83nfsd.sh reloadidmap - - -", "~VornConf", "KLIBCSzListFree",
        "VORNNFSIDMapFree", "SetError"}},
  };
  for (const FailureCase& c : failures) {
    FakePlatform platform;
    Furnish(&platform);
    const Pairs before = platform.mappings;
    platform.Fail(c.operation);
    ExpectFailure(platform, Call(NFSIDMapSet, kReplace), kReplace, 2302, "idmap", {c.text});
    EXPECT_EQ(platform.mappings != before, c.written) << c.operation;
    ASSERT_GE(platform.calls.size(), c.last_calls.size());
    const auto last = platform.calls.end() - static_cast<std::ptrdiff_t>(c.last_calls.size());
    EXPECT_EQ(std::vector<std::string>(last, platform.calls.end()), c.last_calls) << c.operation;
  }
}

TEST(NFSIDMapSet, RefusesAnIDMapWithoutTable) {
  FakePlatform platform;
  platform.has_table = false;
  EXPECT_EQ(Call(NFSIDMapSet, kReplace).code, 2302);
  EXPECT_THAT(platform.LogTexts(),
              ElementsAre(StartsWith("Failed to VORNNFSIDMapGet, vornerr=[0x"), RequestText(kReplace)));
  EXPECT_THAT(platform.calls, ElementsAre("GetParam", "VORNNFSIDMapGet", "VORNNFSIDMapFree", "SetError"));
  EXPECT_THAT(platform.live_objects, IsEmpty());
}

TEST(NFSIDMapSet, AnswersOnceWhenAnyCallFails) {
  // A principal whose look-up fails counts as free.
  EXPECT_EQ(ExpectOneAnswerWhenAnyCallFails({NFSIDMapSet, kReplace, Furnish}, {"KLIBCSzHashGetValue"}), 8);
}

TEST(NFSIDMapSet, ReleasesEverythingWhenAnyCallThrows) {
  EXPECT_EQ(ExpectOnlyReleasesWhenAnyCallThrows({NFSIDMapSet, kReplace, Furnish}), 13);
  const char* const unknown_user = R"({"id": "a@BOX", "kerberos_principal": "b@BOX", "local_name": "dave"})";
  EXPECT_EQ(ExpectOnlyReleasesWhenAnyCallThrows({NFSIDMapSet, unknown_user, Furnish}), 8);
}

TEST(NFSIDMapSet, AcceptsEveryNonNegativeResult) {
  ExpectSuccessForEveryNonNegativeResult({NFSIDMapSet, kReplace, Furnish});
}

}  // namespace
