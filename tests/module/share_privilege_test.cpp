#include <gmock/gmock.h>

#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <string>
#include <vector>

#include "each_call.h"
#include "entry_functions.h"
#include "expect_failure.h"
#include "fake_platform.h"

// Replaces malloc(3) in everything that is linked into this program, the module included. Fails on demand.
namespace {

size_t g_failing_size = 0;
int g_failing_count = 0;  // which allocation of that size fails, from 1
int g_records = 0;        // blocks of that size so far

}  // namespace

namespace {

bool FailsAllocation(size_t size) {
  if (size != g_failing_size || ++g_records != g_failing_count) return false;
  errno = ENOMEM;
  return true;
}

}  // namespace

#pragma GCC visibility push(default)  // libraries see them too
extern "C" {

// NOLINTBEGIN(bugprone-reserved-identifier): the linker's names for what it wraps
void* __real_malloc(size_t size);
void* __real_calloc(size_t count, size_t size);

void* __wrap_malloc(size_t size) { return FailsAllocation(size) ? nullptr : __real_malloc(size); }

// The compiler replaces malloc(3) and memset(3) of the block by calloc(3).
void* __wrap_calloc(size_t count, size_t size) {
  return FailsAllocation(count * size) ? nullptr : __real_calloc(count, size);
}
// NOLINTEND(bugprone-reserved-identifier)
}
#pragma GCC visibility pop

namespace {

using testing::Contains;
using testing::ElementsAre;
using testing::ElementsAreArray;
using testing::IsEmpty;
using testing::Not;

// Makes the n-th allocation of a size fail during its lifetime.
class FailingMalloc {
 public:
  FailingMalloc(size_t size, int n) {
    g_failing_size = size;
    g_failing_count = n;
    g_records = 0;
  }
  ~FailingMalloc() { g_failing_size = 0; }
  FailingMalloc(const FailingMalloc&) = delete;
  FailingMalloc& operator=(const FailingMalloc&) = delete;
};

constexpr char kFullRule[] =
    R"({"client": "10.0.0.0/24", "privilege": "rw", "root_squash": "admin", "async": true, "insecure": true,
        "crossmnt": true, "security_flavor": {"sys": true, "kerberos": true, "kerberos_integrity": true,
        "kerberos_privacy": true}})";

std::string Save(const std::string& rules) { return R"({"share_name": "data", "rule": [)" + rules + "]}"; }

// Returns a valid rule with one key changed, or removed if `value` is empty.
std::string SaveWith(const std::string& key, const std::string& value) {
  Json::Value rule = Parse(kFullRule);
  rule.removeMember(key);
  if (!value.empty()) rule[key] = Parse(value);
  return Save(rule.toStyledString());
}

ExportRule Record(const char* client) {
  ExportRule record{};
  std::strcpy(record.client, client);
  record.write_mode = VORNNFS_WRITE_SYNC;
  record.sys = 1;
  return record;
}

bool SameRecord(const ExportRule& a, const ExportRule& b) {
  return std::memcmp(&a, &b, offsetof(ExportRule, next)) == 0;
}

void Furnish(FakePlatform* platform) { platform->rules = {Record("a"), Record("b")}; }

const std::vector<std::string> kChecks = {"GetParam",
                                          "VORNShareGet data",
                                          "KLIBSharePathGet",
                                          "VORNFSHasMountPointType /volume1/data 32",
                                          "VORNNFSSupportKerberos",
                                          "VORNShareFree"};

std::vector<std::string> AfterChecks(const std::vector<std::string>& calls) {
  std::vector<std::string> all = kChecks;
  all.insert(all.end(), calls.begin(), calls.end());
  return all;
}

// ------------------------------------------------------------------------------------------ load

TEST(NFSSharePrivilegeLoad, AnswersWithTheRulesInThePlatformsOrder) {
  FakePlatform platform;
  ExportRule second = Record("*.lab");
  second.privilege = 1;
  second.squash = VORNNFS_SQUASH_ALL_ADMIN;
  second.write_mode = VORNNFS_WRITE_ASYNC;
  second.insecure = second.crossmnt = second.krb5 = second.krb5i = second.krb5p = 1;
  second.sys = 0;
  platform.rules = {Record("10.0.0.1"), second};
  const Answer answer = Call(NFSSharePrivilegeGet, R"({"share_name": "data"})");
  EXPECT_EQ(answer.code, 0);
  EXPECT_EQ(answer.data, Parse(R"({"rule": [
      {"client": "10.0.0.1", "privilege": "ro", "root_squash": "root", "async": false, "insecure": false,
       "crossmnt": false, "security_flavor": {"sys": true, "kerberos": false, "kerberos_integrity": false,
       "kerberos_privacy": false}},
      {"client": "*.lab", "privilege": "rw", "root_squash": "all_admin", "async": true, "insecure": true,
       "crossmnt": true, "security_flavor": {"sys": false, "kerberos": true, "kerberos_integrity": true,
       "kerberos_privacy": true}}]})"));
  EXPECT_THAT(platform.calls, ElementsAre("GetParam", "VORNShareGet data", "KLIBSharePathGet",
                                          "VORNNFSRuleExtGet /etc/exports /volume1/data", "VORNNFSSupportKerberos",
                                          "VORNShareFree", "VORNNFSRuleExtFree", "SetSuccess"));
  EXPECT_THAT(platform.live_objects, IsEmpty());
}

TEST(NFSSharePrivilegeLoad, AnswersWithAnEmptyArrayForAShareWithoutRules) {
  for (const bool listed_empty : {false, true}) {
    FakePlatform platform;
    platform.rules_listed_empty = listed_empty;
    const Answer answer = Call(NFSSharePrivilegeGet, R"({"share_name": "data"})");
    EXPECT_EQ(answer.data, Parse(R"({"rule": []})"));
    EXPECT_EQ(testing::Matches(Contains("VORNNFSSupportKerberos"))(platform.calls), listed_empty);
    EXPECT_THAT(platform.live_objects, IsEmpty());
  }
}

TEST(NFSSharePrivilegeLoad, ShowsRulesOnlyIfTheyAreFoundAndPresent) {
  FakePlatform platform;
  platform.rules_found = 1;  // without a list
  EXPECT_EQ(Call(NFSSharePrivilegeGet, R"({"share_name": "data"})").data, Parse(R"({"rule": []})"));
  Furnish(&platform);
  platform.rules_found = 0;  // with one
  EXPECT_EQ(Call(NFSSharePrivilegeGet, R"({"share_name": "data"})").data, Parse(R"({"rule": []})"));
  EXPECT_THAT(platform.live_objects, IsEmpty());
}

struct CodeCase {
  const char* name;
  int32_t ExportRule::*field;
  int32_t code;
  const char* key;
  const char* value;  // null: the key is left out
};

TEST(NFSSharePrivilegeLoad, ShowsEachCodeAsItsWordAndOmitsUnknownCodes) {
  const CodeCase cases[] = {
      {"ro", &ExportRule::privilege, 0, "privilege", R"("ro")"},
      {"rw", &ExportRule::privilege, 1, "privilege", R"("rw")"},
      {"no privilege", &ExportRule::privilege, 7, "privilege", nullptr},
      {"root", &ExportRule::squash, 0, "root_squash", R"("root")"},
      {"admin", &ExportRule::squash, 1, "root_squash", R"("admin")"},
      {"guest", &ExportRule::squash, 2, "root_squash", R"("guest")"},
      {"all_admin", &ExportRule::squash, 3, "root_squash", R"("all_admin")"},
      {"no squash mode", &ExportRule::squash, 4, "root_squash", nullptr},
      {"async", &ExportRule::write_mode, 0, "async", "true"},
      {"sync", &ExportRule::write_mode, 1, "async", "false"},
      {"no write mode", &ExportRule::write_mode, 2, "async", nullptr},
      {"insecure", &ExportRule::insecure, 1, "insecure", "true"},
      {"insecure 2", &ExportRule::insecure, 2, "insecure", "false"},
      {"crossmnt", &ExportRule::crossmnt, 1, "crossmnt", "true"},
      {"crossmnt -1", &ExportRule::crossmnt, -1, "crossmnt", "false"},
  };
  for (const CodeCase& c : cases) {
    FakePlatform platform;
    platform.rules = {Record("a")};
    platform.rules[0].*c.field = c.code;
    const Json::Value rule = Call(NFSSharePrivilegeGet, R"({"share_name": "data"})").data["rule"][0];
    EXPECT_EQ(rule.isMember(c.key), c.value != nullptr) << c.name;
    if (c.value == nullptr) continue;
    EXPECT_EQ(rule[c.key], Parse(c.value)) << c.name;
  }
}

TEST(NFSSharePrivilegeLoad, ShowsAFlavourOnlyForFlagOne) {
  FakePlatform platform;
  platform.rules = {Record("a")};
  platform.rules[0].sys = 2;
  platform.rules[0].krb5i = 1;
  EXPECT_EQ(Call(NFSSharePrivilegeGet, R"({"share_name": "data"})").data["rule"][0]["security_flavor"],
            Parse(R"({"sys": false, "kerberos": false, "kerberos_integrity": true, "kerberos_privacy": false})"));
}

TEST(NFSSharePrivilegeLoad, HidesTheFlavoursWithoutKerberos) {
  FakePlatform platform;
  platform.kerberos_support = 0;
  platform.rules = {Record("a")};
  platform.rules[0].krb5 = 1;
  EXPECT_FALSE(Call(NFSSharePrivilegeGet, R"({"share_name": "data"})").data["rule"][0].isMember("security_flavor"));
}

TEST(NFSSharePrivilegeLoad, RefusesAMissingOrEmptyShareName) {
  for (const char* name : {"", "null", "5", "5.5", "true", "[]", "{}", "\"\""}) {
    FakePlatform platform;
    const std::string params = *name == '\0' ? "{}" : std::string(R"({"share_name": )") + name + "}";
    ExpectFailure(platform, Call(NFSSharePrivilegeGet, params), params, 2301, "share_privilege",
                  {"string variable 'share_name' is missing or empty."});
    EXPECT_THAT(platform.calls, ElementsAre("GetParam", "SetError", "GetParam"));
  }
}

TEST(NFSSharePrivilegeLoad, FailsWithItsTextAndReleasesTheShare) {
  const std::string params = R"({"share_name": "data"})";
  {
    FakePlatform platform;
    platform.Fail("VORNShareGet");
    ExpectFailure(platform, Call(NFSSharePrivilegeGet, params), params, 2370, "share_privilege",
                  {"Failed to LoadShare."});
  }
  {
    FakePlatform platform;
    Furnish(&platform);  // the failed read leaves a list
    platform.Fail("VORNNFSRuleExtGet");
    ExpectFailure(platform, Call(NFSSharePrivilegeGet, params), params, 2302, "share_privilege",
                  {"Failed to VORNNFSRuleExtGet."});
    EXPECT_THAT(platform.calls, Contains("VORNNFSRuleExtFree"));
  }
}

// ----------------------------------------------------------------------------------------- check

struct CheckCase {
  std::string params;
  const char* text;  // null: accepted
};

constexpr char kNoName[] = "string variable 'share_name' is missing.";
constexpr char kNoRule[] = "array variable 'rule' is missing.";
constexpr char kClient[] = "string variable 'client' is missing or contain error symbol in rule.";
constexpr char kPrivilege[] = "string variable 'client' is missing in rule, or the value is not valid.";
constexpr char kSquash[] = "string variable 'root_squash' is missing in rule, or the value is not valid.";
constexpr char kFlavour[] = "array variable 'security_flavor' is missing.";
constexpr char kNoFlavour[] = "should specify at least one variable as true in security_flavor.";

// A key of a rule: the log text for every refused value, and values that are refused or accepted. An empty value leaves
// the key out.
struct KeyCase {
  const char* key;
  const char* text;
  std::vector<const char*> bad;
  std::vector<const char*> good;
};

const KeyCase kRuleKeys[] = {
    {"client",
     kClient,
     {"", "null", "5", "1.5", "true", "[]", "{}", R"-("host(rw)")-", R"-("a)")-", R"("a|b")", R"("a=b")", R"("a b")",
      R"("a'b")", R"("a\"b")", R"("end(")"},
     {R"("")", R"("*")", R"("10.0.0.0/24")", R"("host.example")", R"("a\tb")"}},
    {"privilege",
     kPrivilege,
     {"", "null", "5", "1.5", "true", "[]", "{}", R"("RW")", R"("r")", R"("rwx")", R"("")"},
     {R"("rw")", R"("ro")"}},
    {"root_squash",
     kSquash,
     {"", "null", "5", "1.5", "true", "[]", "{}", R"("Root")", R"("all")", R"("")"},
     {R"("root")", R"("admin")", R"("guest")", R"("all_admin")"}},
    {"async",
     "bool variable 'async' is missing in rule.",
     {"", "null", "1", "1.5", R"("true")", "[]", "{}"},
     {"true", "false"}},
    {"insecure",
     "bool variable 'insecure' is missing in rule.",
     {"", "null", "1", "1.5", R"("true")", "[]", "{}"},
     {"true", "false"}},
    {"crossmnt",
     "bool variable 'crossmnt' is missing in rule.",
     {"", "null", "1", "1.5", R"("true")", "[]", "{}"},
     {"true", "false"}},
    {"security_flavor", kFlavour, {"", "null", "1", "1.5", R"("sys")", "true", "[]"}, {R"({"sys": true})"}},
};

constexpr struct {
  const char* key;
  const char* text;
} kFlavourKeys[] = {
    {"sys", "variable 'sys' is not bool type in security_flavor."},
    {"kerberos", "variable 'kerberos' is not bool type in security_flavor."},
    {"kerberos_integrity", "variable 'kerberos_integrity' is not bool type in security_flavor."},
    {"kerberos_privacy", "variable 'kerberos_privacy' is not bool type in security_flavor."},
};

void AddRuleKeyCases(std::vector<CheckCase>* cases) {
  for (const KeyCase& key : kRuleKeys) {
    for (const char* bad : key.bad) cases->push_back({SaveWith(key.key, bad), key.text});
    for (const char* good : key.good) cases->push_back({SaveWith(key.key, good), nullptr});
  }
}

void AddFlavourCases(std::vector<CheckCase>* cases) {
  for (const auto& flavour : kFlavourKeys) {
    const std::string key = std::string("{\"") + flavour.key + "\": ";
    for (const char* bad : {"1", "1.5", "\"true\"", "[]", "{}"}) {
      cases->push_back({SaveWith("security_flavor", key + bad + "}"), flavour.text});
    }
    cases->push_back({SaveWith("security_flavor", key + "true}"), nullptr});
    cases->push_back({SaveWith("security_flavor", key + "false}"), kNoFlavour});
    cases->push_back({SaveWith("security_flavor", key + "null}"), kNoFlavour});
  }
  cases->push_back({SaveWith("security_flavor", "{}"), kNoFlavour});
  cases->push_back({SaveWith("security_flavor", R"({"sys": null, "kerberos_privacy": true, "foreign": 5})"), nullptr});
}

std::vector<CheckCase> CheckCases() {
  std::vector<CheckCase> cases = {
      {"null", kNoName},
      {"{}", kNoName},
      {R"({"share_name": null, "rule": []})", kNoName},
      {R"({"share_name": 5, "rule": []})", kNoName},
      {R"({"share_name": ["data"], "rule": []})", kNoName},
      {R"({"share_name": "data"})", kNoRule},
      {R"({"share_name": "data", "rule": null})", kNoRule},
      {R"({"share_name": "data", "rule": {}})", kNoRule},
      {R"({"share_name": "data", "rule": "x"})", kNoRule},
      {R"({"share_name": "data", "rule": 1})", kNoRule},
      {Save(""), nullptr},
      {Save("5"), kClient},
      {Save("null"), kClient},
      {Save("\"x\""), kClient},
      {Save("[]"), kClient},
      {Save("{}"), kClient},
  };
  AddRuleKeyCases(&cases);
  AddFlavourCases(&cases);
  return cases;
}

TEST(NFSSharePrivilegeSave, ChecksEveryKeyBeforeItWritesAnything) {
  for (const CheckCase& c : CheckCases()) {
    FakePlatform platform;
    const Answer answer = Call(NFSSharePrivilegeSet, c.params);
    if (c.text == nullptr) {
      EXPECT_EQ(answer.code, 0) << c.params;
      EXPECT_THAT(platform.log, IsEmpty()) << c.params;
      continue;
    }
    ExpectFailure(platform, answer, c.params, 2301, "share_privilege", {c.text});
    EXPECT_THAT(platform.calls, Not(Contains(testing::StartsWith("VORNNFSRuleExtSetAll")))) << c.params;
    EXPECT_THAT(platform.calls, Not(Contains("KLIBServiceReload nfsd"))) << c.params;
  }
}

TEST(NFSSharePrivilegeSave, ReportsTheFirstBadKeyOfTheFirstBadRule) {
  const std::string params =
      Save(std::string(kFullRule) + R"(, {"client": "ok", "privilege": "RW"}, {"client": "bad one"})");
  FakePlatform platform;
  ExpectFailure(platform, Call(NFSSharePrivilegeSet, params), params, 2301, "share_privilege", {kPrivilege});
}

TEST(NFSSharePrivilegeSave, IgnoresFlavoursWithoutKerberos) {
  for (const char* flavour : {"", "null", "5", "[]", "{}", R"({"sys": "x"})", R"({"sys": false})"}) {
    FakePlatform platform;
    platform.kerberos_support = 0;
    EXPECT_EQ(Call(NFSSharePrivilegeSet, SaveWith("security_flavor", flavour)).code, 0) << flavour;
    ASSERT_EQ(platform.rules.size(), 1U) << flavour;
    const ExportRule& rule = platform.rules[0];
    EXPECT_EQ(std::vector<int>({rule.sys, rule.krb5, rule.krb5i, rule.krb5p}), std::vector<int>({1, 0, 0, 0}))
        << flavour;
  }
}

TEST(NFSSharePrivilegeSave, LeavesAnEmptyShareNameToTheLookup) {
  const std::string params = R"({"share_name": "", "rule": []})";
  FakePlatform platform;
  ExpectFailure(platform, Call(NFSSharePrivilegeSet, params), params, 2370, "share_privilege",
                {"Failed to LoadShare."});
  EXPECT_THAT(platform.calls, ElementsAre("GetParam", "VORNShareGet", "SetError", "GetParam"));
}

TEST(NFSSharePrivilegeSave, RefusesAShareWithAMountThatCannotBeExported) {
  FakePlatform platform;
  platform.mount_point_result = 1;
  const std::string params = Save("");
  ExpectFailure(platform, Call(NFSSharePrivilegeSet, params), params, 2371, "share_privilege",
                {"Failed to VORNFSHasMountPointType."});
  EXPECT_THAT(platform.calls,
              ElementsAre("GetParam", "VORNShareGet data", "KLIBSharePathGet",
                          "VORNFSHasMountPointType /volume1/data 32", "VORNShareFree", "SetError", "GetParam"));
}

TEST(NFSSharePrivilegeSave, SavesAlthoughTheMountTestFails) {
  FakePlatform platform;
  platform.Fail("VORNFSHasMountPointType");
  EXPECT_EQ(Call(NFSSharePrivilegeSet, Save(kFullRule)).code, 0);
  ExpectLog(platform, "share_privilege", {"Fail to check VORNFSHasMountPoint(/volume1/data)[0x00AB mounts.cpp:42]"});
  EXPECT_EQ(platform.rules.size(), 1U);
}

TEST(NFSSharePrivilegeSave, TreatsEveryOtherMountTestResultAsNoMount) {
  FakePlatform platform;
  platform.mount_point_result = 2;
  EXPECT_EQ(Call(NFSSharePrivilegeSet, Save(kFullRule)).code, 0);
}

// ------------------------------------------------------------------------------------------ save

TEST(NFSSharePrivilegeSave, WritesEveryFieldThenReloads) {
  FakePlatform platform;
  const Answer answer = Call(NFSSharePrivilegeSet, Save(kFullRule));
  EXPECT_EQ(answer.code, 0);
  EXPECT_TRUE(answer.data.isNull());
  ExportRule expected{};
  std::strcpy(expected.client, "10.0.0.0/24");
  expected.privilege = expected.insecure = expected.crossmnt = 1;
  expected.squash = VORNNFS_SQUASH_ADMIN;
  expected.write_mode = VORNNFS_WRITE_ASYNC;
  expected.sys = expected.krb5 = expected.krb5i = expected.krb5p = 1;
  ASSERT_EQ(platform.rules.size(), 1U);
  EXPECT_TRUE(SameRecord(platform.rules[0], expected)) << "the whole record, the client's rest zeroed";
  EXPECT_THAT(platform.calls,
              ElementsAreArray(AfterChecks({"VORNShareGet data", "KLIBSharePathGet", "VORNNFSSupportKerberos",
                                            "VORNNFSRuleExtSetAll /volume1/data", "KLIBServiceReload nfsd",
                                            "VORNShareFree", "VORNNFSRuleExtFree", "SetSuccess"})));
  EXPECT_THAT(platform.live_objects, IsEmpty());
}

TEST(NFSSharePrivilegeSave, GivesEachWordItsCode) {
  const struct {
    const char* key;
    const char* value;
    int32_t ExportRule::*field;
    int32_t code;
  } cases[] = {
      {"privilege", R"("ro")", &ExportRule::privilege, 0},
      {"root_squash", R"("root")", &ExportRule::squash, 0},
      {"root_squash", R"("guest")", &ExportRule::squash, 2},
      {"root_squash", R"("all_admin")", &ExportRule::squash, 3},
      {"async", "false", &ExportRule::write_mode, 1},
      {"insecure", "false", &ExportRule::insecure, 0},
      {"crossmnt", "false", &ExportRule::crossmnt, 0},
      {"security_flavor", R"({"sys": true})", &ExportRule::krb5, 0},
      {"security_flavor", R"({"sys": true})", &ExportRule::sys, 1},
      {"security_flavor", R"({"kerberos": true})", &ExportRule::sys, 0},
      {"security_flavor", R"({"kerberos": true})", &ExportRule::krb5, 1},
      {"security_flavor", R"({"kerberos_integrity": true})", &ExportRule::krb5i, 1},
      {"security_flavor", R"({"kerberos_privacy": true, "sys": null})", &ExportRule::krb5p, 1},
  };
  for (const auto& c : cases) {
    FakePlatform platform;
    EXPECT_EQ(Call(NFSSharePrivilegeSet, SaveWith(c.key, c.value)).code, 0) << c.key << c.value;
    ASSERT_EQ(platform.rules.size(), 1U);
    EXPECT_EQ(platform.rules[0].*c.field, c.code) << c.key << c.value;
  }
}

TEST(NFSSharePrivilegeSave, KeepsTheOrderOfTheArray) {
  std::string rules;
  for (const char* client : {"z", "a", "m"}) {
    Json::Value rule = Parse(kFullRule);
    rule["client"] = client;
    rules += (rules.empty() ? "" : ",") + rule.toStyledString();
  }
  FakePlatform platform;
  Call(NFSSharePrivilegeSet, Save(rules));
  std::vector<std::string> clients;
  for (const ExportRule& rule : platform.rules) clients.emplace_back(rule.client);
  EXPECT_THAT(clients, ElementsAre("z", "a", "m"));
}

TEST(NFSSharePrivilegeSave, RemovesAllRulesForAnEmptyArray) {
  FakePlatform platform;
  Furnish(&platform);
  EXPECT_EQ(Call(NFSSharePrivilegeSet, Save("")).code, 0);
  EXPECT_THAT(platform.rules, IsEmpty());
  EXPECT_THAT(platform.calls, Contains("VORNNFSRuleExtSetAll /volume1/data (null)"));
  EXPECT_THAT(platform.calls, Contains("KLIBServiceReload nfsd"));
}

TEST(NFSSharePrivilegeSave, TruncatesTextsThatDoNotFitTheRecord) {
  FakePlatform platform;
  platform.shares["data"] = "/" + std::string(600, 'p');
  EXPECT_EQ(Call(NFSSharePrivilegeSet, SaveWith("client", '"' + std::string(2000, 'c') + '"')).code, 0);
  ASSERT_EQ(platform.rules.size(), 1U);
  EXPECT_EQ(std::string(platform.rules[0].client), std::string(1023, 'c'));
  EXPECT_THAT(platform.calls, Contains("VORNNFSRuleExtSetAll /" + std::string(506, 'p')));
}

TEST(NFSSharePrivilegeSave, SucceedsAlthoughTheReloadFails) {
  FakePlatform platform;
  platform.Fail("KLIBServiceReload");
  EXPECT_EQ(Call(NFSSharePrivilegeSet, Save(kFullRule)).code, 0);
  EXPECT_THAT(platform.log, IsEmpty());
}

TEST(NFSSharePrivilegeSave, DoesNotReloadAfterAFailedWrite) {
  FakePlatform platform;
  platform.Fail("VORNNFSRuleExtSetAll");
  const std::string params = Save(kFullRule);
  ExpectFailure(platform, Call(NFSSharePrivilegeSet, params), params, 2302, "share_privilege",
                {"Failed to VORNNFSRuleSetAll(/volume1/data) "});
  EXPECT_THAT(platform.CallsAfterFailure(), ElementsAre("VORNShareFree", "VORNNFSRuleExtFree", "SetError", "GetParam"));
}

TEST(NFSSharePrivilegeSave, FailsWhenTheShareIsGoneAfterTheCheck) {
  FakePlatform platform;
  platform.Fail("VORNShareGet", 2);
  const std::string params = Save(kFullRule);
  ExpectFailure(platform, Call(NFSSharePrivilegeSet, params), params, 2370, "share_privilege",
                {"Failed to LoadShare."});
  EXPECT_THAT(platform.calls,
              ElementsAreArray(AfterChecks({"VORNShareGet data", "VORNNFSRuleExtFree", "SetError", "GetParam"})));
}

TEST(NFSSharePrivilegeSave, ReleasesEverythingWhenAnyAllocationFails) {
  const std::string params = Save(std::string(kFullRule) + "," + kFullRule + "," + kFullRule);
  const struct {
    size_t size;
    int n;
  } cases[] = {{sizeof(ExportRuleList), 1}, {sizeof(ExportRule), 1}, {sizeof(ExportRule), 2}, {sizeof(ExportRule), 3}};
  for (const auto& c : cases) {
    FakePlatform platform;
    const FailingMalloc failing(c.size, c.n);
    const Answer answer = Call(NFSSharePrivilegeSet, params);
    ExpectFailure(platform, answer, params, 2302, "share_privilege", {"Failed to malloc: Cannot allocate memory"});
    EXPECT_THAT(platform.calls, Not(Contains("VORNNFSRuleExtSetAll /volume1/data"))) << c.n;
    EXPECT_THAT(platform.calls, Not(Contains("KLIBServiceReload nfsd"))) << c.n;
    const bool has_head = c.size == sizeof(ExportRule);
    EXPECT_EQ(testing::Matches(Contains("VORNNFSRuleExtFree"))(platform.calls), has_head) << c.n;
  }
}

TEST(NFSSharePrivilegeSave, LoadsBackWhatItSaved) {
  FakePlatform platform;
  Call(NFSSharePrivilegeSet, Save(kFullRule));
  EXPECT_EQ(Call(NFSSharePrivilegeGet, R"({"share_name": "data"})").data["rule"][0], Parse(kFullRule));
}

// ------------------------------------------------------------------------------------- each call

TEST(NFSSharePrivilege, ReleasesEverythingWhenAnyCallThrows) {
  const std::string save = Save(kFullRule);
  EXPECT_EQ(ExpectOnlyReleasesWhenAnyCallThrows({NFSSharePrivilegeSet, save.c_str(), Furnish}), 11);
  EXPECT_EQ(ExpectOnlyReleasesWhenAnyCallThrows({NFSSharePrivilegeGet, R"({"share_name": "data"})", Furnish}), 6);
}

TEST(NFSSharePrivilege, AcceptsEveryNonNegativeResult) {
  const std::string save = Save(kFullRule);
  ExpectSuccessForEveryNonNegativeResult({NFSSharePrivilegeSet, save.c_str(), Furnish});
  ExpectSuccessForEveryNonNegativeResult({NFSSharePrivilegeGet, R"({"share_name": "data"})", Furnish});
}

}  // namespace
