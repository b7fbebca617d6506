// Hostile values for every parameter of every method: the real module on the Linux platform, on a box
// whose files are checked after each request. No value ends the process or breaks a file, and each
// refusal has a defined code. The real readers check the files that accepted requests wrote.
#include <gmock/gmock.h>

#include <cstdlib>
#include <iomanip>
#include <iostream>
#include <map>
#include <set>
#include <sstream>

#include "captured_log.h"
#include "entry_functions.h"
#include "exportfs_judge.h"
#include "guarded_box.h"
#include "handler.h"
#include "hostile_values.h"
#include "ini_judge.h"
#include "json_input.h"

namespace vorn::server {
namespace {

using testing::AnyOf;
using testing::IsEmpty;

constexpr char kExports[] = "/etc/exports";
constexpr char kIDMap[] = "/etc/idmapd.conf";
constexpr char kSettings[] = "/etc/nfs.conf.d/vorn.conf";

// A method, parameters that it accepts, and the paths of values in them: keys and positions, from the outside in.
struct Method {
  const char* name;
  Entry entry;
  const char* params;
  std::vector<const char*> places;
};

const std::vector<Method>& Methods() {
  static const char settings[] = R"({"enable_nfs": false, "enable_nfs_v4": true, "nfs_v4_domain": "new.example",
      "read_size": 4096, "write_size": 4096, "unix_pri_enable": true})";
  static const std::vector<const char*> setting_places = {"enable_nfs", "enable_nfs_v4", "nfs_v4_domain",
                                                          "read_size",  "write_size",    "unix_pri_enable"};
  static const std::vector<Method> methods = {
      {"NFS v1 get", NFSGet, "{}", {"unknown"}},
      {"NFS v1 set", NFSSet, settings, setting_places},
      {"NFS v2 get", NFSGetV2, "{}", {"unknown"}},
      {"NFS v2 set", NFSSetV2, settings, setting_places},
      {"AdvancedSetting get", NFSAdvGet, "{}", {"unknown"}},
      {"AdvancedSetting set",
       NFSAdvSet,
       R"({"enable_nfs": false, "read_size": 4096, "write_size": 4096, "unix_pri_enable": true,
           "custom_port_enable": true, "statd_port": 1, "nlm_port": 1})",
       {"enable_nfs", "read_size", "write_size", "unix_pri_enable", "custom_port_enable", "statd_port", "nlm_port"}},
      {"Kerberos get", NFSKerberosGet, "{}", {"unknown"}},
      {"Kerberos upload_key", NFSKerberosUploadKey, "{}", {"keytab_file_tmp"}},
      {"Kerberos list", NFSKerberosList, "{}", {"unknown"}},
      {"IDMap list", NFSIDMapList, R"({"suggestion": false})", {"suggestion", "filter", "offset", "limit"}},
      {"IDMap list of suggestions", NFSIDMapList, R"({"suggestion": true})", {"filter", "offset", "limit"}},
      {"IDMap create",
       NFSIDMapCreate,
       R"({"idmap": [{"kerberos_principal": "bob@X", "local_name": "bob"}]})",
       {"idmap", "idmap 0", "idmap 0 kerberos_principal", "idmap 0 local_name"}},
      {"IDMap set",
       NFSIDMapSet,
       R"({"id": "alice@STORAGE.EXAMPLE", "kerberos_principal": "alice@X", "local_name": "alice"})",
       {"id", "kerberos_principal", "local_name"}},
      {"IDMap delete", NFSIDMapDelete, R"({"id": ["x"]})", {"id", "id 0"}},
      {"SharePrivilege load", NFSSharePrivilegeGet, "{}", {"share_name"}},
      {"SharePrivilege save",
       NFSSharePrivilegeSet,
       R"({"share_name": "data", "rule": [{"client": "10.0.0.1", "privilege": "rw", "root_squash": "root",
           "async": true, "insecure": false, "crossmnt": false, "security_flavor": {"sys": true}}]})",
       {"share_name", "rule", "rule 0", "rule 0 client", "rule 0 privilege", "rule 0 root_squash", "rule 0 async",
        "rule 0 insecure", "rule 0 crossmnt", "rule 0 security_flavor", "rule 0 security_flavor sys",
        "rule 0 security_flavor kerberos", "rule 0 security_flavor kerberos_integrity",
        "rule 0 security_flavor kerberos_privacy"}}};
  return methods;
}

// Returns the value at a path.
Json::Value& At(Json::Value* params, const std::string& place) {
  Json::Value* value = params;
  std::istringstream steps(place);
  for (std::string step; steps >> step;) value = value->isArray() ? &(*value)[0] : &(*value)[step];
  return *value;
}

Json::Value Parsed(const std::string& json) {
  std::string error;
  const auto value = ParseJsonObject(json, &error);
  if (!value) throw std::logic_error(error);
  return *value;
}

// Whether the method converts the value to a boolean, so that every value is accepted.
bool IsConverted(const Method& method, const std::string& place) {
  return method.entry == NFSAdvSet && place == "enable_nfs";
}

struct Tally {
  std::set<const void*> values;
  int requests = 0;
  int taken = 0;
  int thrown = 0;  // values that cannot be converted to a boolean
  std::map<int, int> codes;
};

class Hostile : public testing::Test {
 protected:
  // Uses a root in memory, because every accepted request would write to the disk.
  static void SetUpTestSuite() { setenv("TMPDIR", "/dev/shm", 1); }

  // Sends the method's parameters with the hostile value at `place`, and checks the answer and the files.
  void Try(const Method& method, const std::string& place, const HostileValue& hostile);
  void Print() const;

  std::set<std::string> exports_;  // contents of the files after accepted requests
  std::set<std::string> ini_files_;
  std::map<std::string, Tally> tallies_;
  const GuardedBox box_;

 private:
  int Send(const Method& method, const Json::Value& params, Tally* tally);
  void CollectFiles();
};

// Returns the code of the answer, 0 for success; -1 if the method ended with an exception, which a server answers.
int Hostile::Send(const Method& method, const Json::Value& params, Tally* tally) {
  VORN::APIRequest request(params);
  VORN::APIResponse response;
  ++tally->requests;
  try {
    method.entry(&request, &response);
  } catch (const Json::Exception&) {
    ++tally->thrown;
    return -1;
  }
  EXPECT_TRUE(response.answered());
  ++(response.error() == 0 ? tally->taken : tally->codes[response.error()]);
  return response.error();
}

void Hostile::CollectFiles() {
  exports_.insert(box_.root().Read(kExports).value_or(""));
  for (const char* path : {kIDMap, kSettings}) ini_files_.insert(box_.root().Read(path).value_or(""));
}

void Hostile::Try(const Method& method, const std::string& place, const HostileValue& hostile) {
  SCOPED_TRACE(method.name + (", " + place) + ": " + hostile.kind + ", " + hostile.name);
  Json::Value params = Parsed(method.params);
  Json::Value& value = At(&params, place);
  value = hostile.value;
  // The module removes the file that an upload names, so the path must not exist.
  if (place == "keytab_file_tmp" && value.isString()) value = box_.root().At("/none/") + value.asString();

  Tally& tally = tallies_[hostile.kind];
  tally.values.insert(&hostile);
  const int code = Send(method, params, &tally);
  EXPECT_THAT(code, AnyOf(-1, 0, kBadParameter, kPlatformFailure, kPortConflict, kNoKeytab, kNoUpload, kNoLocalUser,
                          kPrincipalSymbol, kNoShare));
  EXPECT_TRUE(code != -1 || IsConverted(method, place));
  EXPECT_THAT(box_.Faults(1), IsEmpty());
  if (!box_.IsUntouched()) {
    EXPECT_FALSE(hostile.never_stored && !IsConverted(method, place));
    CollectFiles();
    box_.Restore();
  }
  TakeLog();
}

void Hostile::Print() const {
  std::cout << std::left << std::setw(34) << "kind" << std::right << std::setw(8) << "values" << std::setw(10)
            << "requests" << std::setw(8) << "taken" << std::setw(8) << "thrown"
            << "  refused with\n";
  for (const auto& [kind, tally] : tallies_) {
    std::cout << std::left << std::setw(34) << kind << std::right << std::setw(8) << tally.values.size()
              << std::setw(10) << tally.requests << std::setw(8) << tally.taken << std::setw(8) << tally.thrown << " ";
    for (const auto& [code, count] : tally.codes) std::cout << " " << code << ":" << count;
    std::cout << "\n";
  }
}

// ---------------------------------------------------------------------------------------------
// The contents of the files as their readers parse them.

// Returns the content without the keys that requests may change.
IniContent WithoutOurs(IniContent content) {
  content.erase("static");
  content.erase("vorn");
  content["general"].erase("domain");
  content["translation"].erase("gss-methods");
  for (const char* key : {"vers4", "vers4.0", "vers4.1", "vers4.2"}) content["nfsd"].erase(key);
  for (const char* key : {"port", "udp-port"}) content["lockd"].erase(key);
  content["statd"].erase("port");
  content["mountd"].erase("manage-gids");
  return content;
}

std::vector<std::string> LinesOfOthers(const std::string& table) {
  std::istringstream lines(table);
  std::vector<std::string> others;
  for (std::string line; std::getline(lines, line);) {
    if (line.rfind("/volume1/data", 0) != 0) others.push_back(line);
  }
  return others;
}

TEST_F(Hostile, ValuesGetIntoNoFileAndHaveAClearCode) {
  for (const HostileValue& hostile : HostileValues()) {
    for (const Method& method : Methods()) {
      for (const char* place : method.places) Try(method, place, hostile);
    }
  }
  Print();

  const std::string settings = box_.root().Read(kSettings).value_or("");
  const std::string id_map = box_.root().Read(kIDMap).value_or("");
  const IniContent before[] = {WithoutOurs(ReadByNfsconf(settings)), WithoutOurs(ReadByNfsconf(id_map))};
  for (const std::string& text : ini_files_) {
    EXPECT_THAT(WithoutOurs(ReadByNfsconf(text)), AnyOf(before[0], before[1])) << text;
  }
  std::cout << ini_files_.size() << " INI files read by nfsconf, " << exports_.size() << " exports files";
  const ExportfsJudge judge;
  std::cout << (judge.Unavailable().empty() ? " by exportfs\n" : " not: " + judge.Unavailable() + "\n");
  if (!judge.Unavailable().empty()) return;
  const std::vector<std::string> files(exports_.begin(), exports_.end());
  const std::string exports = box_.root().Read(kExports).value_or("");
  const auto wanted = LinesOfOthers(judge.Judge({exports}, {"dump01.example.net"})[0].table);
  EXPECT_EQ(wanted.size(), 3U);
  const auto verdicts = judge.Judge(files, {"dump01.example.net"});
  for (std::size_t i = 0; i < files.size(); ++i) EXPECT_EQ(LinesOfOthers(verdicts[i].table), wanted) << files[i];
}

// The server's JSON reader refuses hostile JSON before it reaches the module.
TEST_F(Hostile, JsonReachesNoMethod) {
  for (const HostileJson& json : HostileJsonTexts()) {
    for (const char* before : {"", "{\"filter\": ", "{\"idmap\": [", "{"}) {
      Tally& tally = tallies_[json.kind];
      tally.values.insert(&json);
      ++tally.requests;
      const std::string after = before == std::string("{\"idmap\": [") ? "]}" : "}";
      std::string error;
      EXPECT_FALSE(ParseJsonObject(before + json.text + (*before == '\0' ? "" : after), &error))
          << json.kind << ": " << before << json.text.substr(0, 100);
      EXPECT_NE(error, "");
    }
  }
  Print();
}

}  // namespace
}  // namespace vorn::server
