// The parameters of all methods, and through them the files of a box: the module on the Linux platform, in a root
// in memory. Properties: a request changes only the lines that it may change, all files can still be read afterwards,
// and the box returns the values that it accepted.
#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <optional>
#include <string>
#include <string_view>
#include <utility>

#include "api_table.h"
#include "captured_log.h"
#include "entry_functions.h"
#include "guarded_box.h"
#include "json_input.h"
#include "require.h"

namespace {

constexpr std::size_t kRows = 15;
constexpr std::size_t kHead = 2;  // method, state of the box
constexpr char kUpload[] = "/tmp/upload";

struct Outcome {
  bool answered = false;  // or left with an exception that the server answers
  int code = -1;
  Json::Value data;
};

Outcome Call(Entry entry, const Json::Value& params) {
  VORN::APIRequest request(params);
  VORN::APIResponse response;
  try {
    entry(&request, &response);
  } catch (const Json::Exception&) {  // a value of the wrong type where the type does not matter
    return {};
  }
  Require(response.answered(), "one answer");
  return {true, response.error(), response.data()};
}

Json::Value Ask(Entry entry, const Json::Value& params = Json::objectValue) {
  const Outcome outcome = Call(entry, params);
  Require(outcome.code == 0, "everything can be read");
  return outcome.data;
}

Json::Value DataShare() {
  Json::Value params;
  params["share_name"] = "data";
  return params;
}

// Stores the upload in a file and passes its path, as the server does.
void StoreUpload(const GuardedBox& box, Json::Value* params) {
  if (!params->isMember("keytab_file_tmp")) return;
  Json::Value& upload = (*params)["keytab_file_tmp"];
  box.root().Write(kUpload, upload.isString() ? upload.asString() : "");
  upload = box.root().At(kUpload);
}

void RemoveUpload(const GuardedBox& box) { static_cast<void>(std::remove(box.root().At(kUpload).c_str())); }

// ---------------------------------------------------------------------------------------------
// The checks of the box's state after a method that succeeded.

bool IsListed(const Json::Value& idmap, const std::string& principal, const std::string& local_name) {
  return std::any_of(idmap.begin(), idmap.end(), [&](const Json::Value& mapping) {
    return mapping["kerberos_principal"].asString() == principal && mapping["local_name"].asString() == local_name;
  });
}

void CheckMappings(const Json::Value& params) {
  Json::Value wanted = params["idmap"];
  if (wanted.isNull()) wanted.append(params);
  const Json::Value idmap = Ask(NFSIDMapList)["idmap"];
  // If a principal is given twice, the last name counts.
  for (const Json::Value& mapping : wanted) {
    const std::string principal = mapping["kerberos_principal"].asString();
    const auto same = [&](const Json::Value& other) { return other["kerberos_principal"] == principal; };
    if (std::count_if(wanted.begin(), wanted.end(), same) > 1) continue;
    Require(IsListed(idmap, principal, mapping["local_name"].asString()), "an accepted mapping is there");
  }
}

void CheckSettings(const Json::Value& params) {
  const Json::Value settings = Ask(NFSGet);
  for (const char* key : {"read_size", "write_size", "enable_nfs", "enable_nfs_v4", "unix_pri_enable"}) {
    Require(params[key].isNull() || params[key].asInt() == settings[key].asInt(), "an accepted setting is there");
  }
  const std::string domain = params["nfs_v4_domain"].asString();
  if (domain.empty() || !settings["enable_nfs_v4"].asBool()) return;
  Require(domain == settings["nfs_v4_domain"].asString(), "an accepted domain is there");
}

void CheckRules(const Json::Value& params) {
  if (params["share_name"] != "data") return;
  const Json::Value rules = Ask(NFSSharePrivilegeGet, DataShare())["rule"];
  Require(rules.size() == params["rule"].size(), "every accepted rule is there");
  for (Json::ArrayIndex i = 0; i < rules.size(); ++i) {
    for (const char* key : {"client", "privilege", "root_squash", "async", "insecure", "crossmnt"}) {
      Require(rules[i][key] == params["rule"][i][key], "an accepted rule is there");
    }
  }
}

void CheckEffect(Entry entry, const Json::Value& params) {
  if (entry == NFSIDMapCreate || entry == NFSIDMapSet) CheckMappings(params);
  if (entry == NFSSet || entry == NFSSetV2) CheckSettings(params);
  if (entry == NFSSharePrivilegeSet) CheckRules(params);
}

// Checks that all reading methods still answer, with success or failure of the request.
void CheckReadable() {
  for (const Entry entry : {NFSGet, NFSAdvGet, NFSKerberosGet, NFSKerberosList, NFSIDMapList}) Ask(entry);
  Ask(NFSSharePrivilegeGet, DataShare());
}

void CheckLog() {
  for (const LogLine& line : TakeLog()) {
    const auto of_a_line = [](char c) { return static_cast<unsigned char>(c) >= 0x20 && c != 0x7f; };
    Require(line.text.find_first_not_of(' ') != std::string::npos, "a log line says something");
    // The module's own lines quote what they refuse; the platform's begin with a whole file's name.
    if (line.text.substr(0, line.text.find(' ')).find(".cpp:") == std::string::npos) continue;
    Require(std::all_of(line.text.begin(), line.text.end(), of_a_line), "a line of the platform is one line");
  }
}

const GuardedBox& Box() {
  setenv("TMPDIR", "/dev/shm", 1);
  static const GuardedBox box;
  return box;
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  if (size < kHead) return 0;
  const std::string_view text(reinterpret_cast<const char*>(data) + kHead, size - kHead);
  std::string error;
  std::optional<Json::Value> params = vorn::server::ParseJsonObject(text, &error);
  if (!params) return 0;

  const GuardedBox& box = Box();
  if ((data[1] & 1) != 0) box.root().Write("/var/lib/vorn/nfsd.state", "enabled\n");
  StoreUpload(box, &*params);
  const Entry entry = gTable[static_cast<std::uint8_t>(data[0] - 'a') % kRows].handler;
  const Outcome outcome = Call(entry, *params);
  RemoveUpload(box);

  for (const std::string& fault : box.Faults((*params)["idmap"].size() + 1)) Require(false, fault.c_str());
  if (outcome.code == 0) CheckEffect(entry, *params);
  if (!box.IsUntouched()) CheckReadable();
  CheckLog();
  box.Restore();
  return 0;
}
