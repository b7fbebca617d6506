// The API "VORN.Core.FileServ.NFS.Access" against the fake platform.
#include "access_handler.h"

#include <gmock/gmock.h>

#include <string>
#include <utility>
#include <vector>

#include "fake_platform.h"

namespace {

using testing::Contains;
using testing::ElementsAre;
using testing::IsEmpty;
using CheckResult = VORN::AccessCheck::Result;

constexpr char kAPI[] = "VORN.Core.FileServ.NFS.Access";

Answer Explain(const std::string& params) { return Call(EntryOf(kAPI, "explain"), params); }
Answer Matrix(const std::string& params) { return Call(EntryOf(kAPI, "matrix"), params); }

constexpr char kQuestion[] = R"({"share": "data", "client": "10.0.0.5"})";

class AccessTest : public testing::Test {
 protected:
  // The calls of the platform, without those of the framework.
  std::vector<std::string> Questions() const {
    std::vector<std::string> questions;
    for (const std::string& call : platform.calls) {
      if (call.compare(0, 7, "Explain") == 0) questions.push_back(call);
    }
    return questions;
  }

  FakePlatform platform;
};

TEST_F(AccessTest, IsAskedForWithDefaults) {
  EXPECT_EQ(Explain(kQuestion).code, 0);
  EXPECT_EQ(Explain(R"({"share": "data", "client": "c", "flavor": null, "version": null, "port": null, "user": null,
                        "groups": null})")
                .code,
            0);
  EXPECT_THAT(Questions(),
              ElementsAre("ExplainAccess data 10.0.0.5 sys 4.2 0 ''", "ExplainAccess data c sys 4.2 0 ''"));
}

TEST_F(AccessTest, IsAskedForWithAllThatAClientMayBe) {
  EXPECT_EQ(Explain(R"({"share": "data", "client": "c", "flavor": "krb5p", "version": "3", "port": 65535,
                        "user": "alice", "groups": ["users", "27"]})")
                .code,
            0);
  EXPECT_EQ(Explain(R"({"share": "data", "client": "c", "version": "4", "port": 1})").code, 0);
  EXPECT_THAT(Questions(),
              ElementsAre("ExplainAccess data c krb5p 3 65535 'alice' users 27", "ExplainAccess data c sys 4.2 1 ''"));
}

TEST_F(AccessTest, RefusesParametersThatAreNoQuestion) {
  const std::pair<const char*, const char*> cases[] = {
      {"share", R"({"client": "c"})"},
      {"share", R"({"share": "", "client": "c"})"},
      {"share", R"({"share": 1, "client": "c"})"},
      {"client", R"({"share": "data"})"},
      {"client", R"({"share": "data", "client": "a\u0000b"})"},
      {"flavor", R"({"share": "data", "client": "c", "flavor": "none"})"},
      {"flavor", R"({"share": "data", "client": "c", "flavor": 5})"},
      {"version", R"({"share": "data", "client": "c", "version": "2"})"},
      {"port", R"({"share": "data", "client": "c", "port": 0})"},
      {"port", R"({"share": "data", "client": "c", "port": 65536})"},
      {"port", R"({"share": "data", "client": "c", "port": "1"})"},
      {"user", R"({"share": "data", "client": "c", "user": 1000})"},
      {"groups", R"({"share": "data", "client": "c", "groups": "users"})"},
      {"groups", R"({"share": "data", "client": "c", "groups": [1]})"},
      {"groups", R"({"share": "data", "client": "c", "groups": [""]})"},
  };
  for (const auto& [name, params] : cases) {
    platform.log.clear();
    EXPECT_EQ(Explain(params).code, kBadParameter) << params;
    EXPECT_THAT(platform.LogTexts(), Contains("variable '" + std::string(name) + "' is missing or not accepted."));
  }
  EXPECT_THAT(Questions(), IsEmpty());
}

TEST_F(AccessTest, TellsWhyItCannotBeExplained) {
  const std::pair<int, int> cases[] = {{VORN::kAccessFailed, kPlatformFailure},
                                       {VORN::kAccessNoShare, kNoShare},
                                       {VORN::kAccessNoUser, kNoUser},
                                       {VORN::kAccessNoGroup, kNoGroup}};
  platform.Fail("ExplainAccess");
  for (const auto& [result, code] : cases) {
    platform.FailWith("ExplainAccess", result);
    EXPECT_EQ(Explain(kQuestion).code, code);
  }
  EXPECT_THAT(platform.LogTexts(), Contains("Failed to ExplainAccess, vornerr=[0x00AB]"));
}

TEST_F(AccessTest, IsAnsweredAsThePlatformExplainsIt) {
  platform.access.path = "/volume1/data";
  platform.access.addresses = {"10.0.0.5", "fd00::5"};
  platform.access.names = {"c.example"};
  platform.access.mountable = true;
  platform.access.read = true;
  platform.access.rule = {"/volume1/data", "10.0.0.0/24", "network", "/etc/exports", 3, "decides", "It decides."};
  platform.access.others = {{"/volume1/data", "*", "everybody", "", 0, "kind", "It loses."}};
  platform.access.identity = {65534, 4294967295, {27, 44}, "root_squash", "Root is squashed.", "/etc/exports", 3};
  platform.access.checks = {{"port", CheckResult::kPassed, "A reserved port.", ""},
                            {"flavor", CheckResult::kFailed, "Not accepted.", "Add it."},
                            {"name", CheckResult::kUnknown, "No answer.", ""}};
  EXPECT_EQ(Explain(kQuestion).data.toStyledString(), Parse(R"({
    "path": "/volume1/data", "addresses": ["10.0.0.5", "fd00::5"], "names": ["c.example"],
    "mountable": true, "read": true, "write": false,
    "rule": {"directory": "/volume1/data", "client": "10.0.0.0/24", "kind": "network", "file": "/etc/exports",
             "line": 3, "reason": "decides", "text": "It decides."},
    "others": [{"directory": "/volume1/data", "client": "*", "kind": "everybody", "file": null, "line": null,
                "reason": "kind", "text": "It loses."}],
    "identity": {"uid": 65534, "gid": 4294967295, "groups": [27, 44], "by": "root_squash",
                 "text": "Root is squashed.", "file": "/etc/exports", "line": 3},
    "checks": [{"check": "port", "result": "passed", "text": "A reserved port.", "remedy": null},
               {"check": "flavor", "result": "failed", "text": "Not accepted.", "remedy": "Add it."},
               {"check": "name", "result": "unknown", "text": "No answer.", "remedy": null}]})")
                                                          .toStyledString());
}

TEST_F(AccessTest, HasNullForWhatThereIsNot) {
  const Json::Value data = Explain(kQuestion).data;
  EXPECT_TRUE(data["rule"].isNull());
  EXPECT_TRUE(data["identity"].isNull());
  EXPECT_EQ(data["others"], Json::Value(Json::arrayValue));
  EXPECT_EQ(data["checks"], Json::Value(Json::arrayValue));
}

TEST_F(AccessTest, IsListedForAllSharesByName) {
  platform.shares = {{"music", "/volume2/sounds"}, {"data", "/volume1/data"}, {"backup", "/volume1/backup"}};
  platform.access.path = "/volume1/any";
  platform.access.mountable = true;
  platform.access.rule = {"/volume1/any", "*", "everybody", "/etc/exports", 3, "decides", "It decides."};
  EXPECT_EQ(Matrix(R"({"client": "c", "offset": 1, "limit": 1})").data, Parse(R"({"total": 3, "clients": [], "access": [
      {"share": "data", "path": "/volume1/any", "mountable": true, "read": false, "write": false, "rule": "*"}]})"));
  platform.access.rule.reset();
  const Json::Value data = Matrix(R"({"client": "c", "user": "alice"})").data;
  EXPECT_EQ(data["access"].size(), 3U);
  EXPECT_TRUE(data["access"][0]["rule"].isNull());
  EXPECT_THAT(Questions(), ElementsAre("ExplainAccesses  c sys 4.2 0 '' /data",
                                       "ExplainAccesses  c sys 4.2 0 'alice' /backup /data /music"));
  EXPECT_THAT(platform.live_objects, IsEmpty());
}

TEST_F(AccessTest, IsNotListedForFaultyParametersOrAFailingPlatform) {
  for (const char* params : {"{}", R"({"client": "c", "offset": "1"})", R"({"client": "c", "limit": 1.5})"}) {
    EXPECT_EQ(Matrix(params).code, kBadParameter) << params;
  }
  platform.Fail("ExplainAccesses");
  platform.FailWith("ExplainAccesses", VORN::kAccessNoUser);
  EXPECT_EQ(Matrix(R"({"client": "c"})").code, kNoUser);
  platform.Fail("VORNShareEnum");
  EXPECT_EQ(Matrix(R"({"client": "c"})").code, kPlatformFailure);
  EXPECT_THAT(platform.LogTexts(), Contains("Failed to VORNShareEnum, vornerr=[0x00AB]"));
}

TEST_F(AccessTest, IsListedForAllClientsOfAShare) {
  platform.client_accesses = {
      {"10.0.0.0/24",
       "network",
       "",
       "10.0.0.1",
       "4.2",
       VORN::AccessRule{"/volume1/data", "10.0.0.0/24", "network", "/etc/exports", 3, "decides", "It decides."},
       {{"sys", true, true, false}, {"krb5", false, false, false}},
       "It stands for the network."},
      {"10.0.0.7", "", "connected", "", "3", std::nullopt, {}, ""}};
  EXPECT_EQ(Matrix(R"({"share": "data"})").data.toStyledString(), Parse(R"({"total": 2, "access": [], "clients": [
      {"client": "10.0.0.0/24", "kind": "network", "state": null, "address": "10.0.0.1", "version": "4.2",
       "rule": {"directory": "/volume1/data", "client": "10.0.0.0/24", "kind": "network", "file": "/etc/exports",
                "line": 3, "reason": "decides", "text": "It decides."},
       "flavors": [{"flavor": "sys", "mountable": true, "read": true, "write": false},
                   {"flavor": "krb5", "mountable": false, "read": false, "write": false}],
       "text": "It stands for the network."},
      {"client": "10.0.0.7", "kind": null, "state": "connected", "address": null, "version": "3", "rule": null,
       "flavors": [], "text": null}]})")
                                                                      .toStyledString());
}

TEST_F(AccessTest, IsAskedForAllClientsOfAShare) {
  for (const char* params :
       {R"({"share": "data"})", R"({"share": "data", "flavor": "krb5i", "user": "a@B", "version": "4"})",
        R"({"share": "data", "user": "alice", "groups": ["50"], "version": "3", "port": 1024})",
        R"({"share": "data", "client": null, "offset": 5, "limit": 7})",
        R"({"share": "data", "offset": -1, "limit": -2})", R"({"share": "data", "limit": 1001})"}) {
    EXPECT_EQ(Matrix(params).code, 0) << params;
  }
  EXPECT_THAT(Questions(), ElementsAre("ExplainClients data    0 '' sys krb5 krb5i krb5p from 0 at most 1000",
                                       "ExplainClients data  krb5i 4.2 0 'a@B' krb5i from 0 at most 1000",
                                       "ExplainClients data   3 1024 'alice' 50 sys from 0 at most 1000",
                                       "ExplainClients data    0 '' sys krb5 krb5i krb5p from 5 at most 7",
                                       "ExplainClients data    0 '' sys krb5 krb5i krb5p from 0 at most 0",
                                       "ExplainClients data    0 '' sys krb5 krb5i krb5p from 0 at most 1000"));
}

TEST_F(AccessTest, OfAllClientsIsNotListedForFaultyParametersOrAFailingPlatform) {
  for (const char* params : {R"({"share": ""})", R"({"share": 1})", R"({"share": "data", "client": "c"})",
                             R"({"share": "data", "flavor": "all"})", R"({"share": "data", "limit": "1"})"}) {
    EXPECT_EQ(Matrix(params).code, kBadParameter) << params;
  }
  EXPECT_THAT(platform.LogTexts(), Contains("variables 'client' and 'share' exclude each other."));
  platform.Fail("ExplainClients");
  const std::pair<int, int> cases[] = {{VORN::kAccessFailed, kPlatformFailure},
                                       {VORN::kAccessNoShare, kNoShare},
                                       {VORN::kAccessNoUser, kNoUser},
                                       {VORN::kAccessNoGroup, kNoGroup}};
  for (const auto& [result, code] : cases) {
    platform.FailWith("ExplainClients", result);
    EXPECT_EQ(Matrix(R"({"share": "data"})").code, code);
  }
  EXPECT_THAT(platform.LogTexts(), Contains("Failed to ExplainClients, vornerr=[0x00AB]"));
}

}  // namespace
