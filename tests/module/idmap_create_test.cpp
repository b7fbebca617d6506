// The method "create": accepted parameters, conflicts, and the writing of new mappings.
#include <gmock/gmock.h>

#include <string>
#include <vector>

#include "each_call.h"
#include "entry_functions.h"
#include "expect_failure.h"
#include "fake_lists.h"
#include "fake_platform.h"
#include "idmap.h"

namespace {

using testing::Contains;
using testing::ElementsAre;
using testing::ElementsAreArray;
using testing::IsEmpty;
using testing::Not;
using testing::StartsWith;

constexpr char kNoArray[] = "array variable 'idmap' is missing.";
constexpr char kNoPrincipal[] = "string variable 'kerberos_principal' is missing or empty in idmap.";
constexpr char kNoLocalName[] = "string variable 'local_name' is missing or empty in idmap.";
constexpr char kNoUser[] = "'local_name' should be local user.";
constexpr char kWrongInput[] = "Wrong idmap input.";

constexpr char kTwoNew[] = R"({"idmap": [{"kerberos_principal": "b@BOX", "local_name": "bob"},
                                         {"kerberos_principal": "r@BOX", "local_name": "root"}]})";

void Furnish(FakePlatform* platform) {
  platform->mappings = {{"a@BOX", "alice"}};
  platform->enabled = 1;
}

// Request parameters with `items`, the elements of a JSON array.
std::string Mappings(const std::string& items) { return R"({"idmap": [)" + items + "]}"; }

std::string Mapping(const std::string& principal, const std::string& local_name) {
  return R"({"kerberos_principal": ")" + principal + R"(", "local_name": ")" + local_name + R"("})";
}

// ---------------------------------------------------------------------------------------- check

struct RefusedCase {
  const char* items;
  int code;
  const char* text;
};

const RefusedCase kRefusedCases[] = {
    {"null", 2301, kNoPrincipal},
    {"true", 2301, kNoPrincipal},
    {"5", 2301, kNoPrincipal},
    {"0.5", 2301, kNoPrincipal},
    {R"("b@BOX")", 2301, kNoPrincipal},
    {"[]", 2301, kNoPrincipal},
    {R"(["b@BOX", "bob"])", 2301, kNoPrincipal},
    {"{}", 2301, kNoPrincipal},

    {R"({"local_name": "bob"})", 2301, kNoPrincipal},
    {R"({"kerberos_principal": null, "local_name": "bob"})", 2301, kNoPrincipal},
    {R"({"kerberos_principal": true, "local_name": "bob"})", 2301, kNoPrincipal},
    {R"({"kerberos_principal": 5, "local_name": "bob"})", 2301, kNoPrincipal},
    {R"({"kerberos_principal": 0.5, "local_name": "bob"})", 2301, kNoPrincipal},
    {R"({"kerberos_principal": "", "local_name": "bob"})", 2301, kNoPrincipal},
    {R"({"kerberos_principal": ["b@BOX"], "local_name": "bob"})", 2301, kNoPrincipal},
    {R"({"kerberos_principal": {}, "local_name": "bob"})", 2301, kNoPrincipal},

    {R"({"kerberos_principal": "b=c@BOX", "local_name": "bob"})", 2353,
     R"(KERBEROS_PRINCIPAL:b=c@BOX contains invalid symbol "=")"},
    {R"({"kerberos_principal": "=", "local_name": "bob"})", 2353,
     R"(KERBEROS_PRINCIPAL:= contains invalid symbol "=")"},
    {R"({"kerberos_principal": "=b@BOX", "local_name": "bob"})", 2353,
     R"(KERBEROS_PRINCIPAL:=b@BOX contains invalid symbol "=")"},
    {R"({"kerberos_principal": "b@BOX=", "local_name": "bob"})", 2353,
     R"(KERBEROS_PRINCIPAL:b@BOX= contains invalid symbol "=")"},

    {R"({"kerberos_principal": "b@BOX"})", 2301, kNoLocalName},
    {R"({"kerberos_principal": "b@BOX", "local_name": null})", 2301, kNoLocalName},
    {R"({"kerberos_principal": "b@BOX", "local_name": false})", 2301, kNoLocalName},
    {R"({"kerberos_principal": "b@BOX", "local_name": 5})", 2301, kNoLocalName},
    {R"({"kerberos_principal": "b@BOX", "local_name": 0.5})", 2301, kNoLocalName},
    {R"({"kerberos_principal": "b@BOX", "local_name": ""})", 2301, kNoLocalName},
    {R"({"kerberos_principal": "b@BOX", "local_name": ["bob"]})", 2301, kNoLocalName},
    {R"({"kerberos_principal": "b@BOX", "local_name": {}})", 2301, kNoLocalName},

    {R"({"kerberos_principal": "b@BOX", "local_name": "dave"})", 2352, kNoUser},
    {R"({"kerberos_principal": "b@BOX", "local_name": "Bob"})", 2352, kNoUser},
    {R"({"kerberos_principal": "b@BOX", "local_name": "bo"})", 2352, kNoUser},
    {R"({"kerberos_principal": "b@BOX", "local_name": "bob "})", 2352, kNoUser},
    {R"({"kerberos_principal": "b@BOX", "local_name": "bob=bob"})", 2352, kNoUser},
    {R"({"kerberos_principal": "b@BOX", "local_name": "Root"})", 2352, kNoUser},
    {R"({"kerberos_principal": "b@BOX", "local_name": "ROOT"})", 2352, kNoUser},
    {R"({"kerberos_principal": "b@BOX", "local_name": "root "})", 2352, kNoUser},

    // One item breaks several rules: their order decides.
    {R"({"kerberos_principal": "", "local_name": ""})", 2301, kNoPrincipal},
    {R"({"kerberos_principal": "b=", "local_name": ""})", 2353, R"(KERBEROS_PRINCIPAL:b= contains invalid symbol "=")"},
    {R"({"kerberos_principal": "b=", "local_name": "dave"})", 2353,
     R"(KERBEROS_PRINCIPAL:b= contains invalid symbol "=")"},

    // Several items are bad: the first one decides.
    {R"({"kerberos_principal": "b@BOX", "local_name": "dave"}, {"local_name": "bob"})", 2352, kNoUser},
    {R"({"local_name": "bob"}, {"kerberos_principal": "b@BOX", "local_name": "dave"})", 2301, kNoPrincipal},
    {R"({"kerberos_principal": "b@BOX", "local_name": "bob"}, 5)", 2301, kNoPrincipal},
};

TEST(NFSIDMapCreate, RefusesTheFirstBadMappingBeforeItReadsTheIDMap) {
  for (const RefusedCase& c : kRefusedCases) {
    FakePlatform platform;
    Furnish(&platform);
    const std::string params = Mappings(c.items);
    const Answer answer = Call(NFSIDMapCreate, params);
    ExpectFailure(platform, answer, params, c.code, "idmap", {c.text, kWrongInput});
    EXPECT_TRUE(answer.data.isNull()) << c.items;
    EXPECT_THAT(platform.calls, Not(Contains("VORNNFSIDMapGet"))) << c.items;
    EXPECT_THAT(platform.calls, Not(Contains("KLIBCSzHashAlloc 1024"))) << c.items;
  }
}

TEST(NFSIDMapCreate, RefusesANonArrayBeforeAnyPlatformCall) {
  for (const char* params : {"null", "{}", R"({"idmap": null})", R"({"idmap": true})", R"({"idmap": 5})",
                             R"({"idmap": 0.5})", R"({"idmap": "x"})", R"({"idmap": ""})", R"({"idmap": {}})",
                             R"({"idmap": {"kerberos_principal": "b@BOX", "local_name": "bob"}})"}) {
    FakePlatform platform;
    ExpectFailure(platform, Call(NFSIDMapCreate, params), params, 2301, "idmap", {kNoArray, kWrongInput});
    EXPECT_THAT(platform.calls, ElementsAre("GetParam", "SetError")) << params;
  }
}

TEST(NFSIDMapCreate, EnumeratesTheUsersOnceAndFindsEachLocalName) {
  FakePlatform platform;
  Call(NFSIDMapCreate, Mappings(Mapping("b@BOX", "bob") + ", " + Mapping("c@BOX", "dave") + ", 5"));
  EXPECT_THAT(platform.calls, ElementsAre("GetParam", "KLIBCSzListAlloc 1024", "VORNUserEnum 1", "KLIBCSzListFind bob",
                                          "KLIBCSzListFind dave", "KLIBCSzListFree", "SetError"));
}

struct AcceptedCase {
  const char* name;
  std::string items;
};

TEST(NFSIDMapCreate, AcceptsEverythingElse) {
  const AcceptedCase cases[] = {
      {"no mapping", ""},
      {"root, whom no enumeration returns", Mapping("b@BOX", "root")},
      {"a user called Root", Mapping("b@BOX", "Root")},
      {"a user with an equals sign", Mapping("b@BOX", "a=b")},
      {"a principal without realm", Mapping("b", "bob")},
      {"a principal with several parts", Mapping("nfs/x/y@BOX@BOX", "bob")},
      {"a blank for a principal", Mapping(" ", "bob")},
      {"a long principal", Mapping(std::string(5000, 'p'), "bob")},
      {"a user who is mapped already", Mapping("b@BOX", "alice")},
      {"two principals of one user", Mapping("b@BOX", "bob") + ", " + Mapping("B@BOX", "bob")},
      {"one principal twice", Mapping("b@BOX", "bob") + ", " + Mapping("b@BOX", "carol")},
      {"a foreign key", R"({"kerberos_principal": "b@BOX", "local_name": "bob", "id": 5})"},
  };
  for (const AcceptedCase& c : cases) {
    FakePlatform platform;
    Furnish(&platform);
    platform.users = {"alice", "bob", "carol", "Root", "a=b"};
    EXPECT_EQ(Call(NFSIDMapCreate, Mappings(c.items)).code, 0) << c.name;
    EXPECT_THAT(platform.log, IsEmpty()) << c.name;
  }
}

struct CheckFailure {
  const char* operation;
  const char* text;
  std::vector<std::string> calls;
};

TEST(NFSIDMapCreate, FailsWhenTheLocalUsersCannotBeListed) {
  const CheckFailure failures[] = {
      {"KLIBCSzListAlloc", "Failed to KLIBCSzListAlloc.", {"KLIBCSzListAlloc 1024"}},
      {"VORNUserEnum", "Failed to VORNUserEnum.", {"KLIBCSzListAlloc 1024", "VORNUserEnum 1", "KLIBCSzListFree"}},
  };
  for (const CheckFailure& failure : failures) {
    for (const char* params : {kTwoNew, R"({"idmap": []})", R"({"idmap": [5]})"}) {
      FakePlatform platform;
      platform.Fail(failure.operation);
      const Answer answer = Call(NFSIDMapCreate, params);
      ExpectFailure(platform, answer, params, 2302, "idmap", {failure.text, kWrongInput});
      std::vector<std::string> calls{"GetParam"};
      calls.insert(calls.end(), failure.calls.begin(), failure.calls.end());
      calls.emplace_back("SetError");
      EXPECT_THAT(platform.calls, ElementsAreArray(calls));
    }
  }
}

// ------------------------------------------------------------------------------------ conflicts

struct ConflictCase {
  const char* principals;  // of the input, one letter each
  const char* conflicts;   // as JSON, or null
};

TEST(GetConflictPrincipal, ListsMappedPrincipalsOncePerOccurrence) {
  const ConflictCase cases[] = {
      {"", nullptr},      {"B", nullptr},     {"a", nullptr},           {"BB", nullptr},          {"A", R"(["A"])"},
      {"AB", R"(["A"])"}, {"BA", R"(["A"])"}, {"ABA", R"(["A", "A"])"}, {"CBA", R"(["C", "A"])"},
  };
  for (const ConflictCase& c : cases) {
    FakePlatform platform;
    FakeHash table{{{"A", "alice"}, {"C", "carol"}}};
    Json::Value idmap(Json::arrayValue);
    for (const char* p = c.principals; *p != '\0'; ++p) idmap.append(Parse(Mapping(std::string(1, *p), "bob")));
    Json::Value conflicts = "as the caller gave it";
    NFSIDMapServiceHandler handler(nullptr, nullptr);
    const bool found = handler.GetConflictPrincipal(idmap, conflicts, &table);
    EXPECT_EQ(found, c.conflicts != nullptr) << c.principals;
    EXPECT_EQ(conflicts, c.conflicts == nullptr ? Json::Value("as the caller gave it") : Parse(c.conflicts));
    EXPECT_THAT(platform.log, IsEmpty()) << c.principals;
  }
}

TEST(NFSIDMapCreate, AddsNothingAndListsTheConflictsIfAPrincipalIsMapped) {
  FakePlatform platform;
  Furnish(&platform);
  const Pairs before = platform.mappings;
  const std::string params = Mappings(Mapping("b@BOX", "bob") + ", " + Mapping("a@BOX", "alice"));
  const Answer answer = Call(NFSIDMapCreate, params);
  ExpectFailure(platform, answer, params, 2351, "idmap", {"Conflict principal input."});
  EXPECT_EQ(answer.data, Parse(R"({"principal_conflict": ["a@BOX"]})"));
  EXPECT_EQ(platform.mappings, before);
  EXPECT_THAT(platform.calls, ElementsAre("GetParam", "KLIBCSzListAlloc 1024", "VORNUserEnum 1", "KLIBCSzListFind bob",
                                          "KLIBCSzListFind alice", "KLIBCSzListFree", "KLIBCSzHashAlloc 1024",
                                          "VORNNFSIDMapGet", "KLIBCSzHashGetValue b@BOX", "KLIBCSzHashGetValue a@BOX",
                                          "VORNNFSIDMapFree", "KLIBCSzHashFree", "SetError"));
}

TEST(NFSIDMapCreate, ListsAConflictOncePerOccurrence) {
  FakePlatform platform;
  Furnish(&platform);
  const std::string a = Mapping("a@BOX", "bob");
  const Answer answer = Call(NFSIDMapCreate, Mappings(a + ", " + Mapping("b@BOX", "bob") + ", " + a));
  EXPECT_EQ(answer.data, Parse(R"({"principal_conflict": ["a@BOX", "a@BOX"]})"));
}

// --------------------------------------------------------------------------------------- create

TEST(NFSIDMapCreate, AddsWritesAndReloadsTheMappings) {
  FakePlatform platform;
  Furnish(&platform);
  const Answer answer = Call(NFSIDMapCreate, kTwoNew);
  EXPECT_EQ(answer.code, 0);
  EXPECT_EQ(answer.data, Parse(R"({"id": ["b@BOX", "r@BOX"]})"));
  EXPECT_EQ(platform.mappings, (Pairs{{"a@BOX", "alice"}, {"b@BOX", "bob"}, {"r@BOX", "root"}}));
  EXPECT_EQ(platform.domain, "box.example");
  EXPECT_THAT(
      platform.calls,
      ElementsAre("GetParam", "KLIBCSzListAlloc 1024", "VORNUserEnum 1", "KLIBCSzListFind bob", "KLIBCSzListFind root",
                  "KLIBCSzListFree", "KLIBCSzHashAlloc 1024", "VORNNFSIDMapGet", "KLIBCSzHashGetValue b@BOX",
                  "KLIBCSzHashGetValue r@BOX", "KLIBCSzHashSetValue b@BOX bob", "KLIBCSzHashSetValue r@BOX root",
                  "VORNNFSStaticMapAppend", "VornConf", "VORNNFSIDMapSet /etc/idmapd.conf", "KLIBServiceIsEnabled nfsd",
                  "KLIBCExec /usr/vorn/etc/rc.sysv/S83nfsd.sh reloadidmap - - -", "~VornConf", "VORNNFSIDMapFree",
                  "KLIBCSzHashFree", "SetSuccess"));
  EXPECT_THAT(platform.log, IsEmpty());
  EXPECT_THAT(platform.live_objects, IsEmpty());
}

TEST(NFSIDMapCreate, WritesAndReloadsForAnEmptyArray) {
  FakePlatform platform;
  Furnish(&platform);
  const Answer answer = Call(NFSIDMapCreate, R"({"idmap": []})");
  EXPECT_EQ(answer.code, 0);
  EXPECT_EQ(answer.data, Parse(R"({"id": []})"));
  EXPECT_THAT(platform.calls, Contains("VORNNFSIDMapSet /etc/idmapd.conf"));
  EXPECT_THAT(platform.calls, Contains(StartsWith("KLIBCExec")));
}

TEST(NFSIDMapCreate, ListsAPrincipalThatIsSentTwiceTwice) {
  FakePlatform platform;
  const Answer answer = Call(NFSIDMapCreate, Mappings(Mapping("b@BOX", "bob") + ", " + Mapping("b@BOX", "carol")));
  EXPECT_EQ(answer.data, Parse(R"({"id": ["b@BOX", "b@BOX"]})"));
  EXPECT_EQ(platform.mappings, (Pairs{{"b@BOX", "carol"}}));
}

TEST(NFSIDMapCreate, SkipsAMappingThatCannotBeStored) {
  FakePlatform platform;
  Furnish(&platform);
  platform.Fail("KLIBCSzHashSetValue", 1);
  const Answer answer = Call(NFSIDMapCreate, kTwoNew);
  EXPECT_EQ(answer.code, 0);
  EXPECT_EQ(answer.data, Parse(R"({"id": ["r@BOX"]})"));
  EXPECT_EQ(platform.mappings, (Pairs{{"a@BOX", "alice"}, {"r@BOX", "root"}}));
  ExpectLog(platform, "idmap", {"Failed to KLIBCSzHashSetValue."});
}

TEST(NFSIDMapCreate, SucceedsEvenWhenNoMappingCanBeStored) {
  FakePlatform platform;
  platform.Fail("KLIBCSzHashSetValue");
  const Answer answer = Call(NFSIDMapCreate, kTwoNew);
  EXPECT_EQ(answer.code, 0);
  EXPECT_EQ(answer.data, Parse(R"({"id": []})"));
  EXPECT_THAT(platform.calls, Contains("VORNNFSIDMapSet /etc/idmapd.conf"));
  ExpectLog(platform, "idmap", {"Failed to KLIBCSzHashSetValue.", "Failed to KLIBCSzHashSetValue."});
}

// ------------------------------------------------------------------------------------- failures

struct FailureCase {
  const char* operation;
  const char* text;
  bool written;
  std::vector<std::string> last_calls;  // the failing one and what follows
};

TEST(NFSIDMapCreate, StopsWhereItFailsAndKeepsWhatIsWritten) {
  const FailureCase failures[] = {
      {"KLIBCSzHashAlloc",
       "Failed to KLIBCSzHashAlloc, vornerr=[0x00AB]",
       false,
       {"KLIBCSzListFree", "KLIBCSzHashAlloc 1024", "SetError"}},
      {"VORNNFSIDMapGet",
       "Failed to VORNNFSIDMapGet, vornerr=[0x00AB]",
       false,
       {"KLIBCSzHashAlloc 1024", "VORNNFSIDMapGet", "KLIBCSzHashFree", "SetError"}},
      {"VORNNFSStaticMapAppend",
       "Failed to VORNNFSStaticMapAppend, vornerr=[0x00AB]",
       false,
       {"VORNNFSStaticMapAppend", "VORNNFSIDMapFree", "KLIBCSzHashFree", "SetError"}},
      {"VORNNFSIDMapSet",
       "Failed to VORNNFSIDMapSet, vornerr=[0x00AB]",
       false,
       {"VornConf", "VORNNFSIDMapSet /etc/idmapd.conf", "~VornConf", "VORNNFSIDMapFree", "KLIBCSzHashFree",
        "SetError"}},
      {"KLIBCExec",
       "Failed to KLIBCExec, vornerr=[0x00AB]",
       true,
       {"VornConf", "VORNNFSIDMapSet /etc/idmapd.conf", "KLIBServiceIsEnabled nfsd",
        "KLIBCExec /usr/vorn/etc/rc.sysv/S83nfsd.sh reloadidmap - - -", "~VornConf", "VORNNFSIDMapFree",
        "KLIBCSzHashFree", "SetError"}},
  };
  for (const FailureCase& c : failures) {
    FakePlatform platform;
    Furnish(&platform);
    platform.Fail(c.operation);
    const Answer answer = Call(NFSIDMapCreate, kTwoNew);
    ExpectFailure(platform, answer, kTwoNew, 2302, "idmap", {c.text});
    EXPECT_TRUE(answer.data.isNull()) << c.operation;
    EXPECT_EQ(platform.mappings.size(), c.written ? 3U : 1U) << c.operation;
    ASSERT_GE(platform.calls.size(), c.last_calls.size());
    const auto last = platform.calls.end() - static_cast<std::ptrdiff_t>(c.last_calls.size());
    EXPECT_EQ(std::vector<std::string>(last, platform.calls.end()), c.last_calls) << c.operation;
  }
}

TEST(NFSIDMapCreate, RefusesAnIDMapWithoutTable) {
  FakePlatform platform;
  platform.has_table = false;
  EXPECT_EQ(Call(NFSIDMapCreate, kTwoNew).code, 2302);
  EXPECT_THAT(platform.LogTexts(),
              ElementsAre(StartsWith("Failed to VORNNFSIDMapGet, vornerr=[0x"), RequestText(kTwoNew)));
  EXPECT_THAT(platform.CallsAfterFailure(), Not(Contains("VORNNFSIDMapSet /etc/idmapd.conf")));
  EXPECT_THAT(platform.live_objects, IsEmpty());
}

TEST(NFSIDMapCreate, ReportsAConflictWhenRepeatedAfterAFailedReload) {
  FakePlatform platform;
  Furnish(&platform);
  platform.Fail("KLIBCExec", 1);
  EXPECT_EQ(Call(NFSIDMapCreate, kTwoNew).code, 2302);
  const Answer again = Call(NFSIDMapCreate, kTwoNew);
  EXPECT_EQ(again.code, 2351);
  EXPECT_EQ(again.data, Parse(R"({"principal_conflict": ["b@BOX", "r@BOX"]})"));
}

TEST(NFSIDMapCreate, AnswersOnceWhenAnyCallFails) {
  // A mapping whose look-up fails counts as new.
  const std::vector<std::string> tolerated{"KLIBCSzHashGetValue", "KLIBCSzHashSetValue"};
  EXPECT_EQ(ExpectOneAnswerWhenAnyCallFails({NFSIDMapCreate, kTwoNew, Furnish}, tolerated), 11);
}

TEST(NFSIDMapCreate, ReleasesEverythingWhenAnyCallThrows) {
  EXPECT_EQ(ExpectOnlyReleasesWhenAnyCallThrows({NFSIDMapCreate, kTwoNew, Furnish}), 17);
  const char* const conflict = R"({"idmap": [{"kerberos_principal": "a@BOX", "local_name": "bob"}]})";
  EXPECT_EQ(ExpectOnlyReleasesWhenAnyCallThrows({NFSIDMapCreate, conflict, Furnish}), 8);
}

TEST(NFSIDMapCreate, AcceptsEveryNonNegativeResult) {
  ExpectSuccessForEveryNonNegativeResult({NFSIDMapCreate, kTwoNew, Furnish});
}

}  // namespace
