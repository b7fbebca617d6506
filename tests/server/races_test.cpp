// Many threads and processes call all methods concurrently: the real module on the Linux platform, over one root. Each
// client owns a share, some principals and a setting, and must find its acknowledged changes in them.
#include <gmock/gmock.h>
#include <json/writer.h>

#include <array>
#include <filesystem>
#include <functional>
#include <iostream>
#include <list>
#include <map>
#include <random>
#include <thread>

#include "captured_log.h"
#include "entry_functions.h"
#include "handler.h"
#include "keytab_maker.h"
#include "processes.h"
#include "temporary_root.h"

namespace {

using testing::AnyOf;
using testing::Each;
using testing::HasSubstr;
using testing::Not;

constexpr int kThreads = 4;
constexpr int kProcesses = 3;
constexpr int kRounds = 100;
constexpr char kScript[] = "/usr/vorn/etc/rc.sysv/S83nfsd.sh";
constexpr char kOwnLines[] = "# ours\n/volume1/media *(ro)\n";

struct Answer {
  int code;
  Json::Value data;
};

Answer Ask(Entry entry, const Json::Value& params) {
  VORN::APIRequest request(params);
  VORN::APIResponse response;
  entry(&request, &response);
  EXPECT_TRUE(response.answered());
  return {response.error(), response.data()};
}

Json::Value Object(std::initializer_list<std::pair<const char*, Json::Value>> members) {
  Json::Value object(Json::objectValue);
  for (const auto& [name, value] : members) object[name] = value;
  return object;
}

Json::Value ListOf(const Json::Value& item) {
  Json::Value list(Json::arrayValue);
  list.append(item);
  return list;
}

void Furnish(const TemporaryRoot& root) {
  std::string shares = "[shares]\n";
  for (int client = 0; client < kThreads * kProcesses; ++client) {
    const std::string name = "share" + std::to_string(client);
    shares += name + " = /volume1/" + name + "\n";
    root.Write("/volume1/" + name + "/README", "");
  }
  root.Write("/etc/vorn/shares.conf", shares);
  root.Write("/etc/vorn/platform.conf", "[platform]\nservice_engine = local\nkerberos = yes\nfirewall = no\n");
  root.Write("/etc/exports", kOwnLines);
  root.Write("/etc/idmapd.conf", kOwnLines + std::string("[General]\nDomain = lab.test\n"));
  root.Write("/etc/nfs/krb5.conf", "[libdefaults]\n    default_realm = LAB.TEST\n");
  root.Write(kScript, "#!/bin/sh\n");
  std::filesystem::permissions(root.At(kScript), std::filesystem::perms::owner_all);
  root.Write("/etc/passwd",
             "root:x:0:0::/:/bin/sh\nadmin:x:999:999::/:/bin/sh\nnobody:x:65534:65534::/:/bin/sh\n"
             "alice:x:1000:1000::/:/bin/sh\nbob:x:1001:1001::/:/bin/sh\n");
}

// ---------------------------------------------------------------------------------------------
// A client that calls all methods.

class Client {
 public:
  Client(const TemporaryRoot& root, int number) : root_(root), number_(number), chance_(number) {}

  void Work() {
    const std::array<void (Client::*)(), 9> actions = {
        &Client::ChangeSettings, &Client::ChangeAdvancedSettings, &Client::ReadSettings,  &Client::UploadKeytab,
        &Client::SaveRules,      &Client::CreateMapping,          &Client::ChangeMapping, &Client::DeleteMapping,
        &Client::SuggestMappings};
    for (int round = 0; round < kRounds && !testing::Test::HasFailure(); ++round) {
      (this->*actions[static_cast<size_t>(Any(actions.size()))])();
    }
    ExpectOwnMappings();
    ExpectOwnRules();
  }

 private:
  int Any(size_t count) { return std::uniform_int_distribution<int>(0, static_cast<int>(count) - 1)(chance_); }

  Json::Value Get(Entry entry, const Json::Value& params = Json::Value(Json::objectValue)) const {
    const Answer answer = Ask(entry, params);
    EXPECT_EQ(answer.code, 0) << params;
    return answer.data;
  }

  void ChangeSettings() {
    const Json::Value params =
        Object({{"enable_nfs", Any(2) == 0}, {"nfs_v4_domain", "d" + std::to_string(number_) + ".test"}});
    Get(Any(2) == 0 ? NFSSet : NFSSetV2, params);
  }

  void ChangeAdvancedSettings() {
    const bool ports = Any(2) == 0;
    Json::Value params = Object({{"enable_nfs", true},
                                 {"read_size", 4096},
                                 {"write_size", 8192},
                                 {"unix_pri_enable", Any(2) == 0},
                                 {"custom_port_enable", ports}});
    if (ports) {
      params["statd_port"] = 40000 + 2 * number_;
      params["nlm_port"] = 40001 + 2 * number_;
    }
    // Another program or another client may use the port at this moment.
    EXPECT_THAT(Ask(NFSAdvSet, params).code, AnyOf(0, kPortConflict));
  }

  void ReadSettings() {
    EXPECT_TRUE(Get(NFSGet)["nfs_v4_domain"].isString());
    EXPECT_TRUE(Get(NFSGetV2)["enable_nfs"].isBool());
    EXPECT_TRUE(Get(NFSAdvGet)["read_size"].isInt());
    EXPECT_TRUE(Get(NFSKerberosGet)["kerberos_support"].asBool());
    EXPECT_LE(Get(NFSKerberosList)["keytab"].size(), 1U);
  }

  void UploadKeytab() {
    const std::string path = "/upload" + std::to_string(number_);
    root_.Write(path, EncodeFile({EncodeEntry("box" + std::to_string(number_), "LAB.TEST", 17)}));
    Get(NFSKerberosUploadKey, Object({{"keytab_file_tmp", root_.At(path)}}));
  }

  std::string Share() const { return "share" + std::to_string(number_); }

  void SaveRules() {
    rules_ = Json::Value(Json::arrayValue);
    for (int host = Any(4); host > 0; --host) {
      rules_.append(Object(
          {{"client", "10.0." + std::to_string(number_) + "." + std::to_string(host)},
           {"privilege", Any(2) == 0 ? "rw" : "ro"},
           {"root_squash", "admin"},
           {"async", false},
           {"insecure", false},
           {"crossmnt", false},
           {"security_flavor",
            Object(
                {{"sys", true}, {"kerberos", false}, {"kerberos_integrity", false}, {"kerberos_privacy", false}})}}));
    }
    Get(NFSSharePrivilegeSet, Object({{"share_name", Share()}, {"rule", rules_}}));
    ExpectOwnRules();
  }

  void ExpectOwnRules() const {
    EXPECT_EQ(Get(NFSSharePrivilegeGet, Object({{"share_name", Share()}}))["rule"], rules_) << Share();
  }

  std::string OwnRealm() const { return "@CLIENT" + std::to_string(number_) + ".TEST"; }
  std::string AnyPrincipal() { return "p" + std::to_string(Any(20)) + OwnRealm(); }

  void CreateMapping() {
    const std::string principal = AnyPrincipal();
    const bool is_new = mappings_.emplace(principal, "alice").second;
    const Json::Value mapping = Object({{"kerberos_principal", principal}, {"local_name", "alice"}});
    EXPECT_EQ(Ask(NFSIDMapCreate, Object({{"idmap", ListOf(mapping)}})).code, is_new ? 0 : kPrincipalMapped);
  }

  void ChangeMapping() {
    if (mappings_.empty()) return;
    auto& [principal, local_name] = *mappings_.begin();
    local_name = "bob";
    Get(NFSIDMapSet, Object({{"id", principal}, {"kerberos_principal", principal}, {"local_name", local_name}}));
  }

  void DeleteMapping() {
    if (mappings_.empty()) return;
    const auto last = std::prev(mappings_.end());
    Get(NFSIDMapDelete, Object({{"id", ListOf(last->first)}}));
    mappings_.erase(last);
    ExpectOwnMappings();
  }

  void ExpectOwnMappings() const {
    const Json::Value list = Get(NFSIDMapList, Object({{"suggestion", false}, {"filter", OwnRealm()}}));
    std::map<std::string, std::string> found;
    for (const Json::Value& mapping : list["idmap"]) {
      found[mapping["kerberos_principal"].asString()] = mapping["local_name"].asString();
    }
    EXPECT_EQ(found, mappings_) << OwnRealm();
  }

  void SuggestMappings() { EXPECT_TRUE(Get(NFSIDMapList, Object({{"suggestion", true}}))["idmap"].isArray()); }

  const TemporaryRoot& root_;
  const int number_;
  std::mt19937 chance_;
  Json::Value rules_{Json::arrayValue};
  std::map<std::string, std::string> mappings_;
};

// ---------------------------------------------------------------------------------------------
// Many clients.

using ClientWork = std::function<void(int client)>;

void InThreads(int first, const ClientWork& work) {
  std::list<std::thread> threads;
  for (int thread = 0; thread < kThreads; ++thread) threads.emplace_back(work, first + thread);
  for (std::thread& thread : threads) thread.join();
}

void InProcesses(const ClientWork& work) {
  std::list<ChildProcess> processes;
  for (int process = 0; process < kProcesses; ++process) {
    processes.emplace_back([&, process] {
      InThreads(process * kThreads, work);
      return testing::Test::HasFailure() ? 1 : 0;
    });
  }
  for (ChildProcess& process : processes) EXPECT_EQ(process.Wait(), 0);
}

class Races : public testing::Test {
 protected:
  static void SetUpTestSuite() { setenv("TMPDIR", "/dev/shm", 1); }
  Races() { Furnish(root_); }
  ~Races() override {
    for (const LogLine& line : TakeLog()) {
      if (HasFailure()) std::cout << line.text << "\n";
    }
  }

  void ExpectOrder() const {
    EXPECT_EQ(root_.Read("/etc/exports").value_or("").find(kOwnLines), 0U);
    EXPECT_EQ(root_.Read("/etc/idmapd.conf").value_or("").find(kOwnLines), 0U);
    for (const char* folder : {"/etc", "/etc/nfs", "/etc/nfs.conf.d"}) {
      EXPECT_THAT(root_.Names(folder), Each(Not(HasSubstr(".vorn-")))) << folder;
    }
  }

  const TemporaryRoot root_;
};

TEST_F(Races, ManyThreadsMayCallAllMethods) {
  InThreads(0, [&](int client) { Client(root_, client).Work(); });
  ExpectOrder();
}

TEST_F(Races, ManyProcessesMayCallAllMethods) {
  InProcesses([&](int client) { Client(root_, client).Work(); });
  ExpectOrder();
}

// Each client changes one field of the record, and must find its own value although others change their fields.
void ChangeOneField(int client) {
  const struct {
    Entry set;
    const char* name;
    Json::Value values[2];
  } fields[kThreads] = {{NFSSet, "read_size", {4096, 8192}},
                        {NFSSet, "write_size", {16384, 32768}},
                        {NFSSet, "unix_pri_enable", {true, false}},
                        {NFSSetV2, "nfs_v4_domain", {"a.test", "b.test"}}};
  const auto& field = fields[client % kThreads];
  for (int round = 0; round < kRounds; ++round) {
    const Json::Value& value = field.values[round % 2];
    EXPECT_EQ(Ask(field.set, Object({{"enable_nfs", true}, {field.name, value}})).code, 0) << field.name;
    EXPECT_EQ(Ask(NFSGet, Object({})).data[field.name], value) << field.name;
  }
}

TEST_F(Races, ChangesOfOneRecordLoseNoField) {
  InThreads(0, ChangeOneField);
  ExpectOrder();
}

TEST_F(Races, ChangesOfOneRecordByProcessesLoseNoField) {
  std::list<ChildProcess> processes;
  for (int client = 0; client < kThreads; ++client) {
    processes.emplace_back([client] {
      ChangeOneField(client);
      return testing::Test::HasFailure() ? 1 : 0;
    });
  }
  for (ChildProcess& process : processes) EXPECT_EQ(process.Wait(), 0);
  ExpectOrder();
}

}  // namespace
