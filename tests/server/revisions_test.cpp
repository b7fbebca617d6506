// Changes with If-Match: the real module on the Linux platform, with concurrent clients and an editor.
#include <json/writer.h>

#include <atomic>
#include <thread>
#include <vector>

#include "json_input.h"
#include "module_box.h"

namespace vorn::server {
namespace {

constexpr int kClients = 16;
constexpr char kSettings[] = "/api/VORN.Core.FileServ.NFS/v1/";
constexpr char kRules[] = "/api/VORN.Core.FileServ.NFS.SharePrivilege/v1/";

Json::Value RuleFor(int client) {
  Json::Value rule;
  rule["client"] = "10.0.0." + std::to_string(client);
  rule["privilege"] = "rw";
  rule["root_squash"] = "root";
  for (const char* name : {"async", "insecure", "crossmnt"}) rule[name] = false;
  rule["security_flavor"]["sys"] = true;
  return rule;
}

struct Answer {
  int status;
  Json::Value envelope;
  std::string tag;
};

class Revisions : public ModuleBox {
 protected:
  Answer Call(const std::string& path, const Json::Value& parameters, const std::string& if_match = "") const {
    const Route& route = RouteOf(path);
    VORN::CallDescription description;
    description.may_write = !route.method.reads_only;
    const Response response = if_match.empty() ? RunAndAnswer(route, parameters, description)
                                               : RunIfUnchanged(route, parameters, description, if_match);
    std::string error;
    Answer answer{response.status, ParseJsonObject(response.body, &error).value(), ""};
    for (const auto& [name, value] : response.headers) {
      if (name == "ETag") answer.tag = value;
    }
    return answer;
  }

  static Json::Value Share(const std::string& name) {
    Json::Value parameters;
    parameters["share_name"] = name;
    return parameters;
  }
  Answer LoadRules(const std::string& share = "data") const { return Call(std::string(kRules) + "load", Share(share)); }
  Answer SaveRules(Json::Value rules, const std::string& if_match) const {
    Json::Value parameters = Share("data");
    parameters["rule"] = std::move(rules);
    return Call(std::string(kRules) + "save", parameters, if_match);
  }

  // Adds one rule to those that are there. Reads them again for as long as others change them meanwhile.
  void AddRule(int client) const {
    Answer present = LoadRules();
    Json::Value rules = present.envelope["data"]["rule"];
    for (;;) {
      rules.append(RuleFor(client));
      const Answer saved = SaveRules(rules, present.tag);
      if (saved.status == 200) return;
      ASSERT_EQ(saved.status, 412) << saved.envelope;
      present = saved;
      rules = saved.envelope["error"]["details"]["rule"];
    }
  }
};

TEST_F(Revisions, LetNoClientLoseTheChangeOfAnother) {
  std::vector<std::thread> clients;
  for (int client = 0; client < kClients; ++client) clients.emplace_back([this, client] { AddRule(client + 1); });
  for (std::thread& client : clients) client.join();
  EXPECT_EQ(LoadRules().envelope["data"]["rule"].size(), static_cast<unsigned>(kClients))
      << *root_.Read("/etc/exports");
}

TEST_F(Revisions, NoticeAnEditor) {
  const Answer loaded = LoadRules();
  root_.Write("/etc/exports", "/volume1/data 10.9.9.9(ro)\n");
  Json::Value rules(Json::arrayValue);
  rules.append(RuleFor(1));
  const Answer refused = SaveRules(rules, loaded.tag);
  EXPECT_EQ(refused.status, 412);
  EXPECT_EQ(refused.envelope["error"]["details"]["rule"][0]["client"], "10.9.9.9");
  EXPECT_EQ(root_.Read("/etc/exports"), "/volume1/data 10.9.9.9(ro)\n");
  EXPECT_EQ(SaveRules(rules, refused.tag).status, 200);
}

TEST_F(Revisions, OfOneShareDoNotCountForAnother) {
  EXPECT_EQ(SaveRules(Json::arrayValue, LoadRules("more").tag).status, 412);
}

TEST_F(Revisions, OfSettingsArePairedWithTheirMethod) {
  Json::Value change;
  change["enable_nfs"] = true;
  change["nfs_v4_domain"] = "lab.test";
  const std::string get = std::string(kSettings) + "get";
  const std::string set = std::string(kSettings) + "set";
  const Answer before = Call(get, Json::objectValue);
  EXPECT_EQ(Call(set, change, before.tag).status, 200);
  EXPECT_EQ(Call(set, change, before.tag).status, 412);
  EXPECT_EQ(Call(get, Json::objectValue).envelope["data"]["nfs_v4_domain"], "lab.test");
}

TEST_F(Revisions, AreThereForEveryChangingMethod) {
  for (const APIRow* row = gTable; row->api != nullptr; ++row) {
    std::string unknown;
    const Route* route = routes_.Find(
        std::string("/api/") + row->api + "/v" + std::to_string(row->version) + "/" + row->method, &unknown);
    ASSERT_NE(route, nullptr) << unknown;
    EXPECT_TRUE(route->method.reads_only != (route->shown_by != nullptr)) << route->Id();
  }
}

}  // namespace
}  // namespace vorn::server
