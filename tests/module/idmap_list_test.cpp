// The method "list": configured mappings and suggestions.
#include <gmock/gmock.h>

#include <string>
#include <vector>

#include "each_call.h"
#include "entry_functions.h"
#include "expect_failure.h"
#include "fake_platform.h"
#include "idmap.h"

namespace {

using testing::Contains;
using testing::ElementsAre;
using testing::ElementsAreArray;
using testing::IsEmpty;
using testing::Not;

constexpr char kSuggest[] = R"({"suggestion": true})";
constexpr char kBadType[] = "Invalid type of input.";

// A box with five mappings and, including root, five suggestions.
void Furnish(FakePlatform* platform) {
  platform->mappings = {{"dora@BOX", "alice"}, {"Carl@BOX", "carol"}, {"abel@BOX", "bob"}, {"x", "y"}, {"=", "root"}};
  platform->users = {"dave", "bob", "carol", "alice"};
}

// A request's parameters with one more member.
std::string With(const std::string& params, const std::string& member) {
  return params == "{}" ? "{" + member + "}" : params.substr(0, params.size() - 1) + ", " + member + "}";
}

std::vector<std::string> LocalNames(const Json::Value& data) {
  std::vector<std::string> names;
  for (const Json::Value& item : data["idmap"]) names.push_back(item["local_name"].asString());
  return names;
}

// -------------------------------------------------------------------------------------- answers

TEST(NFSIDMapList, ListsTheMappingsSortedByPrincipal) {
  for (const char* params : {"null", "{}", R"({"suggestion": false})", R"({"suggestion": null, "filter": null})"}) {
    FakePlatform platform;
    platform.mappings = {{"bob@BOX", "bob"}, {"Alice@BOX", "alice"}};
    const Answer answer = Call(NFSIDMapList, params);
    EXPECT_EQ(answer.code, 0) << params;
    EXPECT_EQ(answer.data, Parse(R"({"total": 2, "idmap": [
        {"id": "Alice@BOX", "kerberos_principal": "Alice@BOX", "local_name": "alice"},
        {"id": "bob@BOX", "kerberos_principal": "bob@BOX", "local_name": "bob"}]})"))
        << params;
    EXPECT_THAT(platform.calls,
                ElementsAre("GetParam", "KLIBCSzHashAlloc 1024", "KLIBCSzListAlloc 1024", "VORNNFSStaticMapGet (null)",
                            "KLIBCSzHashEnumKey", "KLIBCSzListSortItems 16", "KLIBCSzListGet 0",
                            "KLIBCSzHashGetValue Alice@BOX", "KLIBCSzListGet 1", "KLIBCSzHashGetValue bob@BOX",
                            "KLIBCSzListFree", "KLIBCSzHashFree", "SetSuccess"))
        << params;
    EXPECT_THAT(platform.log, IsEmpty()) << params;
  }
}

TEST(NFSIDMapList, ListsSuggestionsForRootAndForTheUsersAsEnumerated) {
  FakePlatform platform;
  platform.users = {"zoe", "alice"};
  platform.mappings = {{"alice@BOX.EXAMPLE", "alice"}};  // suggested all the same
  const Answer answer = Call(NFSIDMapList, kSuggest);
  EXPECT_EQ(answer.code, 0);
  EXPECT_EQ(answer.data, Parse(R"({"total": 3, "idmap": [
      {"id": "root@BOX.EXAMPLE", "kerberos_principal": "root@BOX.EXAMPLE", "local_name": "root"},
      {"id": "zoe@BOX.EXAMPLE", "kerberos_principal": "zoe@BOX.EXAMPLE", "local_name": "zoe"},
      {"id": "alice@BOX.EXAMPLE", "kerberos_principal": "alice@BOX.EXAMPLE", "local_name": "alice"}]})"));
  EXPECT_THAT(platform.calls, ElementsAre("GetParam", "KLIBCSzListAlloc 1024",
                                          "KLIBCFileGetSectionValue /etc/nfs/krb5.conf libdefaults default_realm",
                                          "VORNUserEnum 1", "KLIBCSzListInsert 0 root", "KLIBCSzListGet 0",
                                          "KLIBCSzListGet 1", "KLIBCSzListGet 2", "KLIBCSzListFree", "SetSuccess"));
  EXPECT_THAT(platform.log, IsEmpty());
}

TEST(NFSIDMapList, AnswersAnEmptyListWithoutMappings) {
  FakePlatform platform;
  const Answer answer = Call(NFSIDMapList, R"({"offset": 3, "limit": 2})");
  EXPECT_EQ(answer.code, 0);
  EXPECT_EQ(answer.data, Parse(R"({"idmap": [], "total": 0})"));
}

// --------------------------------------------------------------------------------------- filter

TEST(NFSIDMapList, PassesTheFilterOfMappingsToThePlatform) {
  FakePlatform platform;
  Furnish(&platform);
  const Answer answer = Call(NFSIDMapList, R"({"filter": "carol", "limit": 0})");
  EXPECT_EQ(answer.data, Parse(R"({"idmap": [], "total": 1})")) << "the total counts what the filter lets through";
  EXPECT_THAT(platform.calls, Contains("VORNNFSStaticMapGet carol"));
}

TEST(NFSIDMapList, PassesOnAnEmptyFilterOfMappings) {
  FakePlatform platform;
  Call(NFSIDMapList, R"({"filter": ""})");
  EXPECT_THAT(platform.calls, Contains("VORNNFSStaticMapGet")) << "the empty text, not a null pointer";
}

struct SuggestionCase {
  const char* filter;                    // as JSON
  const char* enumeration;               // how the users are asked for
  std::vector<std::string> local_names;  // out of "carol", "rootless" and "u5"
};

TEST(NFSIDMapList, SuggestsRootIfItsNameContainsTheFilterIgnoringCase) {
  const SuggestionCase cases[] = {
      {"null", "VORNUserEnum 1", {"root", "carol", "rootless", "u5"}},
      {R"("")", "VORNUserEnum 1", {"root", "carol", "rootless", "u5"}},
      {R"("ro")", "VORNUserEnumBySubstr 1 ro 1", {"root", "carol", "rootless"}},
      {R"("Ro")", "VORNUserEnumBySubstr 1 Ro 1", {"root", "carol", "rootless"}},
      {R"("r")", "VORNUserEnumBySubstr 1 r 1", {"root", "carol", "rootless"}},
      {R"("OO")", "VORNUserEnumBySubstr 1 OO 1", {"root", "rootless"}},
      {R"("ooT")", "VORNUserEnumBySubstr 1 ooT 1", {"root", "rootless"}},
      {R"("Root")", "VORNUserEnumBySubstr 1 Root 1", {"root", "rootless"}},
      {R"("ROOT")", "VORNUserEnumBySubstr 1 ROOT 1", {"root", "rootless"}},
      {R"("roots")", "VORNUserEnumBySubstr 1 roots 1", {}},
      {R"("rootl")", "VORNUserEnumBySubstr 1 rootl 1", {"rootless"}},
      {R"("root1")", "VORNUserEnumBySubstr 1 root1 1", {}},
      {R"("xroot")", "VORNUserEnumBySubstr 1 xroot 1", {}},
      {R"("rt")", "VORNUserEnumBySubstr 1 rt 1", {}},
      {R"("x")", "VORNUserEnumBySubstr 1 x 1", {}},
      {R"(" ")", "VORNUserEnumBySubstr 1   1", {}},
      {"5", "VORNUserEnumBySubstr 1 5 1", {"u5"}},
      {"0", "VORNUserEnumBySubstr 1 0 1", {}},
      {"-5", "VORNUserEnumBySubstr 1 -5 1", {}},
  };
  for (const SuggestionCase& c : cases) {
    FakePlatform platform;
    platform.users = {"carol", "rootless", "u5"};
    const Answer answer = Call(NFSIDMapList, With(kSuggest, std::string(R"("filter": )") + c.filter));
    EXPECT_EQ(answer.code, 0) << c.filter;
    EXPECT_EQ(LocalNames(answer.data), c.local_names) << c.filter;
    EXPECT_EQ(answer.data["total"], static_cast<int>(c.local_names.size())) << c.filter;
    EXPECT_THAT(platform.calls, Contains(c.enumeration)) << c.filter;
  }
}

TEST(NFSIDMapList, MatchesRootAfterTheUsersWereListed) {
  FakePlatform platform;
  platform.users = {"carol"};
  Call(NFSIDMapList, With(kSuggest, R"("filter": "ro")"));
  EXPECT_THAT(platform.calls,
              ElementsAre("GetParam", "KLIBCSzListAlloc 1024",
                          "KLIBCFileGetSectionValue /etc/nfs/krb5.conf libdefaults default_realm",
                          "VORNUserEnumBySubstr 1 ro 1", "KLIBCUnicodeUTF8StrUpper ro", "KLIBCSzListInsert 0 root",
                          "KLIBCSzListGet 0", "KLIBCSzListGet 1", "KLIBCSzListFree", "SetSuccess"));
}

// ---------------------------------------------------------------------------------------- sizes

TEST(NFSIDMapList, AcceptsAFilterOfUpTo491BytesForSuggestions) {
  FakePlatform platform;
  const std::string longest(491, 'r');
  EXPECT_EQ(Call(NFSIDMapList, With(kSuggest, R"("filter": ")" + longest + '"')).data,
            Parse(R"({"idmap": [], "total": 0})"));

  FakePlatform second;
  const std::string too_long(492, 'r');
  const std::string params = With(kSuggest, R"("filter": ")" + too_long + '"');
  ExpectFailure(second, Call(NFSIDMapList, params), params, 2302, "idmap",
                {"KLIBCUnicodeUTF8StrUpper failed, str=[" + too_long + "]", "AddRootToList Failed"});
}

TEST(NFSIDMapList, AcceptsARealmOfUpTo511Bytes) {
  FakePlatform platform;
  platform.realm = std::string(511, 'R');
  EXPECT_EQ(Call(NFSIDMapList, kSuggest).data["idmap"][0]["id"], "root@" + platform.realm);
  platform.realm += 'R';
  EXPECT_EQ(Call(NFSIDMapList, kSuggest).code, 2302);
}

TEST(NFSIDMapList, TruncatesASuggestedPrincipalTo1023Bytes) {
  FakePlatform platform;
  const std::string fits(1023 - platform.realm.size() - 1, 'u');
  platform.users = {fits, fits + "v", std::string(2000, 'w')};
  const Json::Value items = Call(NFSIDMapList, kSuggest).data["idmap"];
  EXPECT_EQ(items[1]["id"], fits + "@BOX.EXAMPLE");
  EXPECT_EQ(items[2]["id"], fits + "v@BOX.EXAMPL");
  EXPECT_EQ(items[2]["kerberos_principal"], items[2]["id"]);
  EXPECT_EQ(items[2]["local_name"], fits + "v");
  EXPECT_EQ(items[3]["id"], std::string(1023, 'w'));
  EXPECT_EQ(items[3]["local_name"], std::string(2000, 'w')) << "a name is never cut";
}

// --------------------------------------------------------------------------------------- paging

struct PagingCase {
  const char* members;
  int begin;  // of the five there are
  int end;
};

const PagingCase kPagingCases[] = {
    {R"("offset": 0)", 0, 5},
    {R"("offset": null, "limit": null)", 0, 5},
    {R"("offset": 2)", 2, 5},
    {R"("offset": 2.0, "limit": 1.0)", 2, 3},
    {R"("offset": 4)", 4, 5},
    {R"("offset": 5)", 0, 5},
    {R"("offset": 6, "limit": 2)", 0, 2},
    {R"("offset": -1, "limit": 2)", 0, 2},
    {R"("offset": 2147483647, "limit": 2147483647)", 0, 5},
    {R"("offset": -2147483648, "limit": 1)", 0, 1},
    {R"("limit": -1)", 0, 5},
    {R"("limit": 3)", 0, 3},
    {R"("limit": 0)", 0, 0},
    {R"("limit": -2)", 0, 0},
    {R"("limit": -2147483648)", 0, 0},
    {R"("offset": 4, "limit": 2147483647)", 4, 5},
    {R"("offset": 4, "limit": -2147483648)", 4, 4},
    {R"("offset": 1, "limit": 2)", 1, 3},
    {R"("offset": 3, "limit": 2)", 3, 5},
    {R"("offset": 3, "limit": 3)", 3, 5},
    {R"("offset": 3, "limit": -1)", 3, 5},
};

TEST(NFSIDMapList, ReturnsThePageOfTheWholeListing) {
  for (const char* params : {"{}", kSuggest}) {
    FakePlatform platform;
    Furnish(&platform);
    const Json::Value whole = Call(NFSIDMapList, params).data["idmap"];
    ASSERT_EQ(whole.size(), 5U);
    for (const PagingCase& c : kPagingCases) {
      Json::Value expected(Json::arrayValue);
      for (int i = c.begin; i < c.end; ++i) expected.append(whole[i]);
      const Answer answer = Call(NFSIDMapList, With(params, c.members));
      EXPECT_EQ(answer.code, 0) << params << c.members;
      EXPECT_EQ(answer.data["idmap"], expected) << params << c.members;
      EXPECT_EQ(answer.data["total"], 5) << params << c.members;
    }
  }
}

TEST(NFSIDMapList, ReadsOnlyTheItemsOfThePage) {
  FakePlatform platform;
  Furnish(&platform);
  Call(NFSIDMapList, R"({"offset": 1, "limit": 1})");
  EXPECT_THAT(platform.calls, Contains("KLIBCSzListGet 1"));
  EXPECT_THAT(platform.calls, Not(Contains("KLIBCSzListGet 0")));
  EXPECT_THAT(platform.calls, Not(Contains("KLIBCSzListGet 2")));
}

// ---------------------------------------------------------------------------------------- types

struct TypeCase {
  const char* key;
  const char* value;
  bool accepted_for_mappings;
  bool accepted_for_suggestions;
};

const TypeCase kTypeCases[] = {
    {"offset", "null", true, true},
    {"offset", "0", true, true},
    {"offset", "3.0", true, true},
    {"offset", "2147483647", true, true},
    {"offset", "-2147483648", true, true},
    {"offset", "2147483648", false, false},
    {"offset", "-2147483649", false, false},
    {"offset", "1e30", false, false},
    {"offset", "true", false, false},
    {"offset", "false", false, false},
    {"offset", "0.5", false, false},
    {"offset", R"("0")", false, false},
    {"offset", R"("")", false, false},
    {"offset", "[]", false, false},
    {"offset", "[0]", false, false},
    {"offset", "{}", false, false},
    {"limit", "null", true, true},
    {"limit", "-1", true, true},
    {"limit", "3.0", true, true},
    {"limit", "2147483647", true, true},
    {"limit", "-2147483648", true, true},
    {"limit", "2147483648", false, false},
    {"limit", "-2147483649", false, false},
    {"limit", "1e30", false, false},
    {"limit", "true", false, false},
    {"limit", "false", false, false},
    {"limit", "0.5", false, false},
    {"limit", R"("0")", false, false},
    {"limit", R"("")", false, false},
    {"limit", "[]", false, false},
    {"limit", "[0]", false, false},
    {"limit", "{}", false, false},
    {"filter", "null", true, true},
    {"filter", R"("a")", true, true},
    {"filter", R"("")", true, true},
    {"filter", "5", false, true},
    {"filter", "0", false, true},
    {"filter", "-2147483648", false, true},
    {"filter", "2147483648", false, false},
    {"filter", "0.5", false, false},
    {"filter", "true", false, false},
    {"filter", "false", false, false},
    {"filter", "[]", false, false},
    {"filter", R"(["a"])", false, false},
    {"filter", "{}", false, false},
    {"unknown", "{}", true, true},
};

void ExpectType(const std::string& params, bool accepted) {
  FakePlatform platform;
  const Answer answer = Call(NFSIDMapList, params);
  if (accepted) {
    EXPECT_EQ(answer.code, 0) << params;
    EXPECT_THAT(platform.log, IsEmpty()) << params;
    return;
  }
  ExpectFailure(platform, answer, params, 2301, "idmap", {kBadType});
  EXPECT_THAT(platform.calls, ElementsAre("GetParam", "SetError")) << params;
}

TEST(NFSIDMapList, ChecksEveryTypeBeforeAnyPlatformCall) {
  for (const TypeCase& c : kTypeCases) {
    const std::string member = std::string("\"") + c.key + "\": " + c.value;
    ExpectType(With("{}", member), c.accepted_for_mappings);
    ExpectType(With(R"({"suggestion": false})", member), c.accepted_for_mappings);
    ExpectType(With(kSuggest, member), c.accepted_for_suggestions);
  }
  for (const char* suggestion : {R"("true")", R"("")", "0", "1", "1.0", "0.5", "[]", "[true]", "{}"}) {
    ExpectType(With("{}", std::string(R"("suggestion": )") + suggestion), false);
  }
}

TEST(NFSIDMapList, LogsOneLineForSeveralWrongTypes) {
  ExpectType(R"({"suggestion": 1, "offset": "x", "limit": [], "filter": {}})", false);
  ExpectType(R"({"suggestion": true, "offset": "x", "limit": [], "filter": {}})", false);
  ExpectType(R"({"offset": "x", "limit": [], "filter": {}})", false);
}

// ------------------------------------------------------------------------------------- failures

struct FailureCase {
  const char* operation;
  const char* params;
  std::vector<std::string> texts;
  std::vector<std::string> calls;  // between the parameters and the answer
};

constexpr char kRealmCall[] = "KLIBCFileGetSectionValue /etc/nfs/krb5.conf libdefaults default_realm";

const FailureCase kFailures[] = {
    {"KLIBCSzHashAlloc", "{}", {"Failed to KLIBCSzHashAlloc, vornerr=[0x00AB]"}, {"KLIBCSzHashAlloc 1024"}},
    {"KLIBCSzListAlloc",
     "{}",
     {"Failed to KLIBCSzListAlloc, vornerr=[0x00AB]"},
     {"KLIBCSzHashAlloc 1024", "KLIBCSzListAlloc 1024", "KLIBCSzHashFree"}},
    {"VORNNFSStaticMapGet",
     R"({"filter": "a"})",
     {"Failed to VORNNFSStaticMapGet, vornerr=[0x00AB]"},
     {"KLIBCSzHashAlloc 1024", "KLIBCSzListAlloc 1024", "VORNNFSStaticMapGet a", "KLIBCSzListFree", "KLIBCSzHashFree"}},
    {"KLIBCSzHashEnumKey",
     "{}",
     {"Failed to KLIBCSzHashEnumKey, vornerr=[0x00AB]"},
     {"KLIBCSzHashAlloc 1024", "KLIBCSzListAlloc 1024", "VORNNFSStaticMapGet (null)", "KLIBCSzHashEnumKey",
      "KLIBCSzListFree", "KLIBCSzHashFree"}},
    {"KLIBCSzListAlloc", kSuggest, {"Failed to KLIBCSzListAlloc, vornerr=[0x00AB]"}, {"KLIBCSzListAlloc 1024"}},
    {"KLIBCFileGetSectionValue",
     kSuggest,
     {"KLIBCFileGetKeyValue, vornerr=[0x00AB]"},
     {"KLIBCSzListAlloc 1024", kRealmCall, "KLIBCSzListFree"}},
    {"VORNUserEnum",
     kSuggest,
     {"VORNUserEnum Failed, vornerr=[0x00AB]", kNoErrorSetup},
     {"KLIBCSzListAlloc 1024", kRealmCall, "VORNUserEnum 1", "KLIBCSzListFree"}},
    {"VORNUserEnumBySubstr",
     R"({"suggestion": true, "filter": "ro"})",
     {"VORNUserEnumBySubstr Failed, vornerr=[0x00AB]", kNoErrorSetup},
     {"KLIBCSzListAlloc 1024", kRealmCall, "VORNUserEnumBySubstr 1 ro 1", "KLIBCSzListFree"}},
    {"KLIBCUnicodeUTF8StrUpper",
     R"({"suggestion": true, "filter": "ro"})",
     {"KLIBCUnicodeUTF8StrUpper failed, str=[ro]", "AddRootToList Failed"},
     {"KLIBCSzListAlloc 1024", kRealmCall, "VORNUserEnumBySubstr 1 ro 1", "KLIBCUnicodeUTF8StrUpper ro",
      "KLIBCSzListFree"}},
};

TEST(NFSIDMapList, FailsWithItsTextAndReadsTheParametersOnce) {
  for (const FailureCase& c : kFailures) {
    FakePlatform platform;
    Furnish(&platform);
    platform.Fail(c.operation);
    const Answer answer = Call(NFSIDMapList, c.params);
    ExpectFailure(platform, answer, c.params, 2302, "idmap", c.texts);
    EXPECT_TRUE(answer.data.isNull()) << c.operation;
    std::vector<std::string> calls{"GetParam"};
    calls.insert(calls.end(), c.calls.begin(), c.calls.end());
    calls.emplace_back("SetError");
    EXPECT_THAT(platform.calls, ElementsAreArray(calls)) << c.operation;
  }
}

TEST(NFSIDMapList, SuggestsNothingWithoutARealm) {
  FakePlatform platform;
  platform.has_realm = false;
  ExpectFailure(platform, Call(NFSIDMapList, kSuggest), kSuggest, 2302, "idmap",
                {"KLIBCFileGetKeyValue, vornerr=[0x00AB]"});
  EXPECT_EQ(Call(NFSIDMapList, "{}").code, 0) << "mappings need none";
}

TEST(NFSIDMapList, SkipsAnUnreadableKeyWithoutReplacement) {
  FakePlatform platform;
  Furnish(&platform);
  platform.Fail("KLIBCSzListGet", 2);
  const Answer answer = Call(NFSIDMapList, R"({"limit": 3})");
  EXPECT_EQ(answer.code, 0);
  EXPECT_THAT(LocalNames(answer.data), ElementsAre("root", "bob")) << "of root, carol, bob, alice, y";
  EXPECT_EQ(answer.data["total"], 5);
  ExpectLog(platform, "idmap", {"Failed to KLIBCSzListGet, vornerr=[0x00AB]"});
}

TEST(NFSIDMapList, SkipsAKeyWithoutValueWithoutReplacement) {
  FakePlatform platform;
  Furnish(&platform);
  platform.Fail("KLIBCSzHashGetValue", 1);
  const Answer answer = Call(NFSIDMapList, R"({"limit": 3})");
  EXPECT_EQ(answer.code, 0);
  EXPECT_THAT(LocalNames(answer.data), ElementsAre("carol", "bob"));
  EXPECT_EQ(answer.data["total"], 5);
  ExpectLog(platform, "idmap", {"Failed to KLIBCSzHashGetValue."});
}

TEST(NFSIDMapList, AnswersAnEmptyListIfNoKeyCanBeRead) {
  FakePlatform platform;
  Furnish(&platform);
  platform.Fail("KLIBCSzListGet");
  for (const char* params : {"{}", kSuggest}) {
    EXPECT_EQ(Call(NFSIDMapList, params).data, Parse(R"({"idmap": [], "total": 5})")) << params;
  }
}

TEST(NFSIDMapList, SuggestsTheUsersIfRootCannotBeInserted) {
  FakePlatform platform;
  platform.users = {"alice"};
  platform.Fail("KLIBCSzListInsert");
  EXPECT_THAT(LocalNames(Call(NFSIDMapList, kSuggest).data), ElementsAre("alice"));
  EXPECT_THAT(platform.log, IsEmpty());
}

TEST(NFSIDMapList, AnswersOnceWhenAnyCallFails) {
  const std::vector<std::string> tolerated{"KLIBCSzListGet", "KLIBCSzHashGetValue", "KLIBCSzListInsert"};
  EXPECT_EQ(ExpectOneAnswerWhenAnyCallFails({NFSIDMapList, R"({"limit": 3})", Furnish}, tolerated), 4 + 3 * 2);
  EXPECT_EQ(ExpectOneAnswerWhenAnyCallFails({NFSIDMapList, kSuggest, Furnish}, tolerated), 4 + 5);
  const char* const filtered = R"({"suggestion": true, "filter": "o"})";
  EXPECT_EQ(ExpectOneAnswerWhenAnyCallFails({NFSIDMapList, filtered, Furnish}, tolerated), 5 + 3);
}

TEST(NFSIDMapList, ReleasesEverythingWhenAnyCallThrows) {
  EXPECT_EQ(ExpectOnlyReleasesWhenAnyCallThrows({NFSIDMapList, R"({"limit": 3})", Furnish}), 1 + 5 + 3 * 2 + 1);
  EXPECT_EQ(ExpectOnlyReleasesWhenAnyCallThrows({NFSIDMapList, kSuggest, Furnish}), 1 + 4 + 5 + 1);
  EXPECT_EQ(ExpectOnlyReleasesWhenAnyCallThrows({NFSIDMapList, R"({"offset": ""})", Furnish}), 2);
}

TEST(NFSIDMapList, AcceptsEveryNonNegativeResult) {
  for (const char* params : {"{}", kSuggest, R"({"suggestion": true, "filter": "o"})"}) {
    ExpectSuccessForEveryNonNegativeResult({NFSIDMapList, params, Furnish});
  }
}

TEST(NFSIDMapList, AcceptsEmptyStringsFromThePlatform) {
  FakePlatform platform;
  platform.users = {"alice"};
  platform.realm = "";
  const Answer answer = Call(NFSIDMapList, R"({"suggestion": true, "filter": "\u0000"})");
  EXPECT_EQ(answer.code, 0);
  EXPECT_EQ(answer.data["idmap"][0]["id"], "root@");
}

// ----------------------------------------------------------------------------------- root alone

TEST(AddRootToList, RefusesANullListWithoutRecordingACode) {
  KLIBSZLIST* const nothing = nullptr;
  for (KLIBSZLIST* const* list : {static_cast<KLIBSZLIST* const*>(nullptr), &nothing}) {
    FakePlatform platform;
    const Answer answer = Call(
        [&](VORN::APIRequest* request, VORN::APIResponse* response) {
          NFSIDMapServiceHandler handler(request, response);
          EXPECT_FALSE(handler.AddRootToList(const_cast<KLIBSZLIST**>(list), "root"));
          handler.ReportError();
        },
        "{}");
    EXPECT_EQ(answer.code, 2302);
    EXPECT_THAT(platform.calls, ElementsAre("SetError"));
    ExpectLog(platform, "idmap", {"Bad parameter", kNoErrorSetup});
  }
}

}  // namespace
