// Rehearsals of all changing methods: the real module on the Linux platform.
#include <gmock/gmock.h>
#include <json/writer.h>

#include <atomic>
#include <filesystem>
#include <set>
#include <thread>
#include <vector>

#include "foretold.h"
#include "json_input.h"
#include "keytab_maker.h"
#include "module_box.h"
#include "tree_state.h"

namespace vorn::server {
namespace {

using testing::ElementsAre;
using testing::HasSubstr;
using testing::Not;

constexpr char kScript[] = "/usr/vorn/etc/rc.sysv/S83nfsd.sh";
constexpr char kSave[] = "VORN.Core.FileServ.NFS.SharePrivilege/v1/save";
constexpr char kLoad[] = "VORN.Core.FileServ.NFS.SharePrivilege/v1/load";
constexpr char kSet[] = "VORN.Core.FileServ.NFS/v1/set";

Json::Value Parsed(const std::string& json) {
  std::string error;
  const auto value = ParseJsonObject(json, &error);
  if (!value) throw std::logic_error(error + ": " + json);
  return *value;
}

std::string RuleOf(const std::string& client, const std::string& privilege = "rw") {
  return R"({"share_name": "data", "rule": [{"client": ")" + client + R"(", "privilege": ")" + privilege +
         R"(", "root_squash": "root", "async": false, "insecure": false, "crossmnt": false,
             "security_flavor": {"sys": true}}]})";
}

class RehearsalTest : public ModuleBox {
 protected:
  static void SetUpTestSuite() { setenv("TMPDIR", "/dev/shm", 1); }

  RehearsalTest() {
    root_.Write("/etc/exports", "# ours\n/volume1/more *(ro)\n/volume1/data 10.0.0.1(rw,no_root_squash)\n");
    root_.Write("/etc/idmapd.conf", "# ours\n[General]\nDomain = lab.test\n[Static]\nalice@LAB.TEST = alice\n");
    root_.Write("/etc/nfs/krb5.conf", "[libdefaults]\n    default_realm = LAB.TEST\n");
    root_.Write("/etc/passwd",
                "root:x:0:0::/:/bin/sh\nadmin:x:999:999::/:/bin/sh\nnobody:x:65534:65534::/:/bin/sh\n"
                "alice:x:1000:1000::/:/bin/sh\nbob:x:1001:1001::/:/bin/sh\n");
    root_.Write(kScript, "#!/bin/sh\n");
    std::filesystem::permissions(root_.At(kScript), std::filesystem::perms::owner_all);
  }

  Response Rehearsed(const std::string& id, const std::string& json,
                     const std::optional<std::string>& if_match = std::nullopt, bool sees_all = true) const {
    VORN::CallDescription description;
    description.method = id;
    return Rehearse(RouteOf("/api/" + id), Parsed(json), description, if_match, sees_all);
  }

  Response Done(const std::string& id, const std::string& json) const {
    VORN::CallDescription description;
    description.may_write = !RouteOf("/api/" + id).method.reads_only;
    return RunAndAnswer(RouteOf("/api/" + id), Parsed(json), description);
  }

  static Json::Value RehearsalOf(const Response& response) { return Parsed(response.body)["rehearsal"]; }

  // Rehearses the call and carries it out (ExpectForetold). The parameters may name an upload.
  void ExpectSame(const std::string& id, const Json::Value& parameters, std::set<std::string>* succeeded) const {
    SCOPED_TRACE(id + " " + parameters.toStyledString());
    std::vector<std::string> uploads;
    if (parameters["keytab_file_tmp"].isString()) uploads.push_back(parameters["keytab_file_tmp"].asString());
    const auto call = [&] {
      VORN::CallDescription description = VORN::CallContext::Current()->description();
      const Outcome outcome = RunEntryFunction(RouteOf("/api/" + id), parameters, description);
      if (outcome.code() == 0) succeeded->insert(id);
      return AnswerTo(RouteOf("/api/" + id), outcome).body;
    };
    ExpectForetold(root_, call, uploads);
  }
};

// Several calls of each changing method; the later ones find what the earlier ones did.
const std::vector<std::pair<std::string, std::string>>& AllCalls() {
  static const std::string kAdvanced = "VORN.Core.FileServ.NFS.AdvancedSetting/v1/set";
  static const std::string kMap = "VORN.Core.FileServ.NFS.IDMap/v1/";
  static const std::vector<std::pair<std::string, std::string>> calls = {
      {kSet, R"({"enable_nfs": true, "read_size": 65536, "nfs_v4_domain": "new.test", "unix_pri_enable": true})"},
      {kSet, R"({"enable_nfs": true, "enable_nfs_v4": false})"},
      {kSet, R"({"enable_nfs": true, "enable_nfs_v4": true, "nfs_v4_domain": "x\n[Static]"})"},
      {kSet, R"({"enable_nfs": "yes"})"},
      {"VORN.Core.FileServ.NFS/v2/set", R"({"enable_nfs": false})"},
      {"VORN.Core.FileServ.NFS/v2/set", R"({"enable_nfs": true})"},
      {kAdvanced, R"({"enable_nfs": true, "read_size": 4096, "write_size": 8192, "unix_pri_enable": false,
                      "custom_port_enable": true, "statd_port": 40000, "nlm_port": 40001})"},
      {kAdvanced, R"({"enable_nfs": true, "read_size": 4096, "write_size": 8192, "unix_pri_enable": false,
                      "custom_port_enable": true, "statd_port": 40000, "nlm_port": 40000})"},
      {kAdvanced, R"({"enable_nfs": true, "read_size": 0, "write_size": 0, "unix_pri_enable": true,
                      "custom_port_enable": false})"},
      {"VORN.Core.FileServ.NFS.Kerberos/v1/upload_key", R"({"keytab_file_tmp": "good"})"},
      {"VORN.Core.FileServ.NFS.Kerberos/v1/upload_key", R"({"keytab_file_tmp": "bad"})"},
      {"VORN.Core.FileServ.NFS.Kerberos/v1/upload_key", "{}"},
      {kMap + "create", R"({"idmap": [{"kerberos_principal": "bob@LAB.TEST", "local_name": "bob"}]})"},
      {kMap + "create", R"({"idmap": [{"kerberos_principal": "bob@LAB.TEST", "local_name": "bob"}]})"},
      {kMap + "create", R"({"idmap": [{"kerberos_principal": "x@LAB.TEST", "local_name": "nobody else"}]})"},
      {kMap + "set", R"({"id": "bob@LAB.TEST", "kerberos_principal": "robert@LAB.TEST", "local_name": "alice"})"},
      {kMap + "delete", R"({"id": ["robert@LAB.TEST", "unknown@LAB.TEST"]})"},
      {kSave, RuleOf("10.0.0.0/24")},
      {kSave, RuleOf("10.0.0.0/24", "ro")},
      {kSave, RuleOf("two words")},
      {kSave, R"({"share_name": "data", "rule": []})"},
      {kSave, R"({"share_name": "none", "rule": []})"},
  };
  return calls;
}

TEST_F(RehearsalTest, ForetellsTheAnswerAndTheFilesOfEachMethod) {
  std::set<std::string> succeeded;
  for (const auto& [id, json] : AllCalls()) {
    Json::Value parameters = Parsed(json);
    if (parameters["keytab_file_tmp"].isString()) {
      const bool is_good = parameters["keytab_file_tmp"] == "good";
      root_.Write("/upload", is_good ? EncodeFile({EncodeEntry("box", "LAB.TEST", 17)}) : "no keytab");
      parameters["keytab_file_tmp"] = root_.At("/upload");
    }
    ExpectSame(id, parameters, &succeeded);
  }
  for (const APIRow* row = gTable; row->api != nullptr; ++row) {
    const std::string id = std::string(row->api) + "/v" + std::to_string(row->version) + "/" + row->method;
    EXPECT_EQ(succeeded.count(id), RouteOf("/api/" + id).method.reads_only ? 0U : 1U)
        << id << " is not among the calls";
  }
}

TEST_F(RehearsalTest, TellsWhatAChangeOfARuleMeans) {
  const TreeState before = StateOfTree(root_.directory());
  const Response response = Rehearsed(kSave, RuleOf("10.0.0.1", "ro"));
  EXPECT_EQ(response.status, 200);
  EXPECT_EQ(Parsed(response.body)["data"], Json::Value());
  const Json::Value rehearsal = RehearsalOf(response);
  EXPECT_EQ(rehearsal["files"][0]["path"], "/etc/exports");
  EXPECT_THAT(rehearsal["files"][0]["difference"].asString(),
              HasSubstr("-/volume1/data 10.0.0.1(rw,no_root_squash)\n"));
  EXPECT_EQ(rehearsal["rules"].size(), 1U) << rehearsal;
  EXPECT_EQ(rehearsal["rules"][0]["directory"], "/volume1/data");
  EXPECT_EQ(rehearsal["rules"][0]["client"], "10.0.0.1");
  EXPECT_EQ(rehearsal["rules"][0]["changes"][0]["change"], "read_only");
  EXPECT_EQ(rehearsal["rules"][0]["changes"][0]["access"], "less");
  EXPECT_EQ(rehearsal["rules"][0]["changes"][0]["flavor"], "sys");
  EXPECT_EQ(rehearsal["clients"], Json::Value(Json::arrayValue));  // nobody is connected
  EXPECT_EQ(StateOfTree(root_.directory()), before);
}

TEST_F(RehearsalTest, NamesTheClientsWhoseRightsChange) {
  root_.Write("/var/lib/nfs/rmtab", "10.0.0.1:/volume1/data:0x00000001\n10.0.0.9:/volume1/data:0x00000001\n");
  const Json::Value rehearsal = RehearsalOf(Rehearsed(kSave, RuleOf("10.0.0.1", "ro")));
  const Json::Value& clients = rehearsal["clients"];
  ASSERT_EQ(clients.size(), 1U) << clients;
  EXPECT_EQ(clients[0]["address"], "10.0.0.1");
  EXPECT_EQ(clients[0]["version"], "3");
  EXPECT_EQ(clients[0]["path"], "/volume1/data");
  EXPECT_EQ(clients[0]["changes"][0]["change"], "read_only");
  EXPECT_TRUE(clients[0]["certain"].asBool());
  EXPECT_TRUE(rehearsal["all_clients"].asBool());
}

TEST_F(RehearsalTest, TellsTheFindingsThatAChangeAdds) {
  const Json::Value none = RehearsalOf(Rehearsed(kSave, RuleOf("10.0.0.1", "ro")))["findings"];
  EXPECT_EQ(none, Parsed(R"({"added": [], "removed": []})"));
  const char* const mapping = R"({"idmap": [{"kerberos_principal": "r@X", "local_name": "root"}]})";
  const Json::Value findings = RehearsalOf(Rehearsed("VORN.Core.FileServ.NFS.IDMap/v1/create", mapping))["findings"];
  ASSERT_EQ(findings["added"].size(), 1U) << findings;
  EXPECT_EQ(findings["added"][0]["kind"], "mapping_to_root");
  EXPECT_EQ(findings["added"][0]["severity"], "warning");
  EXPECT_THAT(findings["added"][0]["text"].asString(), HasSubstr("r@X"));
  ASSERT_EQ(findings["removed"].size(), 1U) << findings;
  EXPECT_EQ(findings["removed"][0]["kind"], "mapping_without_effect")
      << "a new mapping makes static mappings the first";
}

TEST_F(RehearsalTest, TellsWhatClientsNotice) {
  EXPECT_EQ(Done(kSet, R"({"enable_nfs": true})").status, 200);
  const Json::Value actions =
      RehearsalOf(Rehearsed(kSet, R"({"enable_nfs": true, "enable_nfs_v4": false})"))["actions"];
  ASSERT_EQ(actions.size(), 1U) << actions;
  EXPECT_EQ(actions[0]["action"], "restart");
  EXPECT_EQ(actions[0]["clients"], "restart");
  EXPECT_EQ(actions[0]["grace_seconds"], 90);
  EXPECT_EQ(RehearsalOf(Rehearsed(kSet, R"({"enable_nfs": false})"))["actions"][0]["clients"], "stop");
}

TEST_F(RehearsalTest, OfAFailureHasTheAnswerOfTheFailure) {
  const std::string json = RuleOf("two words");
  const Response foretold = Rehearsed(kSave, json);
  Json::Value envelope = Parsed(foretold.body);
  EXPECT_TRUE(envelope.isMember("rehearsal"));
  envelope.removeMember("rehearsal");
  const Response real = Done(kSave, json);
  EXPECT_EQ(envelope, Parsed(real.body));
  EXPECT_EQ(foretold.status, real.status);
  EXPECT_EQ(foretold.error_code, real.error_code);
}

TEST_F(RehearsalTest, ComparesTheConditionWithTheSameDraft) {
  const Response loaded = Done(kLoad, R"({"share_name": "data"})");
  ASSERT_EQ(loaded.headers.size(), 1U);
  const std::string tag = loaded.headers[0].second;
  EXPECT_EQ(Rehearsed(kSave, RuleOf("10.0.0.2"), tag).status, 200);
  EXPECT_EQ(Rehearsed(kSave, RuleOf("10.0.0.2"), tag).status, 200) << "a rehearsal changes nothing";
  EXPECT_EQ(Rehearsed(kSave, RuleOf("10.0.0.2"), "*").status, 200);
  EXPECT_EQ(Done(kSave, RuleOf("10.0.0.3")).status, 200);
  const TreeState before = StateOfTree(root_.directory());
  const Response refused = Rehearsed(kSave, RuleOf("10.0.0.2"), tag);
  EXPECT_EQ(refused.status, 412);
  EXPECT_EQ(Parsed(refused.body)["error"]["details"]["rule"][0]["client"], "10.0.0.3");
  EXPECT_EQ(RehearsalOf(refused)["files"].size(), 0U);
  EXPECT_EQ(RehearsalOf(refused)["actions"].size(), 0U);
  EXPECT_EQ(StateOfTree(root_.directory()), before);
}

TEST_F(RehearsalTest, ShowsNothingOfAnotherShareToACallerForSomeShares) {
  const Json::Value all = RehearsalOf(Rehearsed(kSave, RuleOf("10.0.0.2")));
  const Json::Value own = RehearsalOf(Rehearsed(kSave, RuleOf("10.0.0.2"), std::nullopt, false));
  EXPECT_THAT(all["files"][0]["difference"].asString(), HasSubstr("/volume1/more"));
  EXPECT_THAT(own["files"][0]["difference"].asString(), Not(HasSubstr("/volume1/more")));
  EXPECT_THAT(own["files"][0]["difference"].asString(), HasSubstr("/volume1/data"));
  EXPECT_TRUE(all.isMember("findings"));
  EXPECT_FALSE(own.isMember("findings"));
}

// Readers rehearse while others change the same file: each rehearsal sees one state of it, and none has an effect.
TEST_F(RehearsalTest, MayRunBesideChanges) {
  constexpr int kRehearsing = 16;
  std::atomic<bool> changing{true};
  std::vector<std::thread> threads;
  for (int i = 0; i < kRehearsing; ++i) {
    threads.emplace_back([&, i] {
      do {
        const Response response = Rehearsed(kSave, RuleOf("10.9.9." + std::to_string(i)));
        EXPECT_EQ(response.status, 200) << response.body;
        EXPECT_EQ(RehearsalOf(response)["files"].size(), 1U) << response.body;
      } while (changing);
    });
  }
  for (int round = 0; round < 20; ++round) {
    const Response response = Done(kSave, RuleOf("10.0.0." + std::to_string(round)));
    EXPECT_EQ(response.status, 200) << response.body;
    EXPECT_EQ(Parsed(response.body)["data"], Json::Value());
    EXPECT_THAT(root_.Read("/etc/exports").value_or(""), HasSubstr("10.0.0." + std::to_string(round) + "("));
  }
  changing = false;
  for (std::thread& thread : threads) thread.join();
  EXPECT_THAT(root_.Read("/etc/exports").value_or(""), Not(HasSubstr("10.9.9.")));
}

}  // namespace
}  // namespace vorn::server
