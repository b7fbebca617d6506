#include "share_privilege.h"

#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <optional>
#include <string>
#include <string_view>

#include "core.h"
#include "export_rules.h"
#include "filesystem.h"
#include "json_text.h"
#include "log.h"
#include "nfsconf.h"
#include "owned.h"
#include "service.h"

namespace {

constexpr char kSource[] = "share_privilege";
constexpr char kExportsFile[] = "/etc/exports";

// Characters that end a client in exports(5) or begin another token.
constexpr char kForbiddenInClient[] = "()|= '\"";

bool CheckClient(const Json::Value& client) {
  const std::optional<std::string_view> text = TextOf(client);
  if (text && text->find_first_of(kForbiddenInClient) == std::string_view::npos) return true;
  LOG_ERROR("string variable 'client' is missing or contain error symbol in rule.");
  return false;
}

bool CheckPrivilege(const Json::Value& privilege) {
  const std::optional<std::string_view> word = TextOf(privilege);
  if (word == "rw" || word == "ro") return true;
  LOG_ERROR("string variable 'client' is missing in rule, or the value is not valid.");
  return false;
}

bool CheckRootSquash(const Json::Value& root_squash) {
  const std::optional<std::string_view> word = TextOf(root_squash);
  for (const char* mode : {"root", "admin", "guest", "all_admin"}) {
    if (word == mode) return true;
  }
  LOG_ERROR("string variable 'root_squash' is missing in rule, or the value is not valid.");
  return false;
}

// A boolean key of a rule, and the log text if its value is not a boolean.
struct BoolKey {
  const char* name;
  const char* text;
};

constexpr BoolKey kSwitches[] = {{"async", "bool variable 'async' is missing in rule."},
                                 {"insecure", "bool variable 'insecure' is missing in rule."},
                                 {"crossmnt", "bool variable 'crossmnt' is missing in rule."}};

constexpr BoolKey kFlavours[] = {
    {"sys", "variable 'sys' is not bool type in security_flavor."},
    {"kerberos", "variable 'kerberos' is not bool type in security_flavor."},
    {"kerberos_integrity", "variable 'kerberos_integrity' is not bool type in security_flavor."},
    {"kerberos_privacy", "variable 'kerberos_privacy' is not bool type in security_flavor."}};

bool CheckSwitches(const Json::Value& rule) {
  for (const BoolKey& key : kSwitches) {
    if (rule[key.name].isBool()) continue;
    LOG_ERROR("%s", key.text);
    return false;
  }
  return true;
}

bool CheckFlavours(const Json::Value& flavours) {
  if (!flavours.isObject()) {
    LOG_ERROR("array variable 'security_flavor' is missing.");
    return false;
  }
  bool any = false;
  for (const BoolKey& key : kFlavours) {
    const Json::Value& flavour = flavours[key.name];
    if (!flavour.isNull() && !flavour.isBool()) {
      LOG_ERROR("%s", key.text);
      return false;
    }
    any = any || flavour.asBool();
  }
  if (any) return true;
  LOG_ERROR("should specify at least one variable as true in security_flavor.");
  return false;
}

// Returns whether a rule may be saved. The security flavours are checked only `with_kerberos`
// (docs/decisions/0033). The platform checks the syntax of the client.
bool CheckRule(const Json::Value& rule, bool with_kerberos) {
  // An element that is not an object is refused like a rule without a client.
  if (!rule.isObject()) return CheckClient(Json::Value::nullSingleton());
  return CheckClient(rule["client"]) && CheckPrivilege(rule["privilege"]) && CheckRootSquash(rule["root_squash"]) &&
         CheckSwitches(rule) && (!with_kerberos || CheckFlavours(rule["security_flavor"]));
}

Share LoadShare(const Json::Value& name) {
  VORNSHARE* handle = nullptr;
  const bool failed = VORNShareGet(name.asCString(), &handle) < 0;
  Share share(handle);
  if (!failed) return share;
  LOG_ERROR("Failed to LoadShare.");
  return nullptr;
}

// A failed test does not prevent an export: docs/decisions/0021.
bool IsExportable(const char* path) {
  const int result = VORNFSHasMountPointType(path, VORNFS_MOUNT_UNEXPORTABLE);
  if (result < 0) {
    LOG_ERROR("Fail to check VORNFSHasMountPoint(%s)[0x%04X %s:%d]", path, KLIBCErrGet(), KLIBCErrorGetFile(),
              KLIBCErrorGetLine());
  }
  if (result != 1) return true;
  LOG_ERROR("Failed to VORNFSHasMountPointType.");
  return false;
}

bool IsKerberosSupported() { return VORNNFSSupportKerberos() != 0; }

bool CheckRules(const Json::Value& rules) {
  const bool with_kerberos = IsKerberosSupported();
  for (const Json::Value& rule : rules) {
    if (!CheckRule(rule, with_kerberos)) return false;
  }
  return true;
}

// Allocates a zeroed record with malloc(3), as VORNNFSRuleExtFree requires. Logs a failure and returns nullptr.
template <typename Record>
Record* Allocate() {
  void* const block = malloc(sizeof(Record));
  if (block != nullptr) return static_cast<Record*>(memset(block, 0, sizeof(Record)));
  LOG_ERROR("Failed to malloc: %s", strerror(errno));
  return nullptr;
}

// Appends all rules in order. After a failure the list owns the records that were built until then.
bool BuildRules(const Json::Value& rules, ExportRuleList* list) {
  const bool with_kerberos = IsKerberosSupported();
  ExportRule** end = &list->first;
  for (const Json::Value& rule : rules) {
    *end = Allocate<ExportRule>();
    if (*end == nullptr) return false;
    RuleFromJson(rule, with_kerberos, *end);
    end = &(*end)->next;
  }
  return true;
}

bool WriteRules(const ExportRuleList& list) {
  if (VORNNFSRuleExtSetAll(list.path, list.first == nullptr ? nullptr : &list) >= 0) return true;
  LOG_ERROR("Failed to VORNNFSRuleSetAll(%s) ", list.path);
  return false;
}

Json::Value RulesToJson(const ExportRuleList& list) {
  const bool with_kerberos = IsKerberosSupported();
  Json::Value rules(Json::arrayValue);
  for (const ExportRule* rule = list.first; rule != nullptr; rule = rule->next) {
    rules.append(RuleToJson(*rule, with_kerberos));
  }
  return rules;
}

}  // namespace

void NFSSharePrivilegeHandler::Get() {
  AnswerWith(HERE, [this](Json::Value& result) { return GetData(Parameters(), result); });
}

void NFSSharePrivilegeHandler::Set() {
  AnswerTo(HERE, [this](const Json::Value& params) { return CheckData(params) && SetData(params); });
}

bool NFSSharePrivilegeHandler::GetData(const Json::Value& params, Json::Value& result) {
  const Json::Value& name = params["share_name"];
  if (!name.isString() || name.asString().empty()) {
    LOG_ERROR("string variable 'share_name' is missing or empty.");
    return Fail(kBadParameter);
  }
  ExportRules rules;
  const Share share = LoadShare(name);
  if (!share) return Fail(kNoShare);
  ExportRuleList* list = nullptr;
  const int found = VORNNFSRuleExtGet(kExportsFile, KLIBSharePathGet(share.get()), &list);
  rules.reset(list);
  if (found < 0) {
    LOG_ERROR("Failed to VORNNFSRuleExtGet.");
    return Fail(kPlatformFailure);
  }
  result["rule"] = found == 0 || !rules ? Json::Value(Json::arrayValue) : RulesToJson(*rules);
  return true;
}

bool NFSSharePrivilegeHandler::CheckData(const Json::Value& params) {
  const Json::Value& name = params["share_name"];
  if (!name.isString()) {
    LOG_ERROR("string variable 'share_name' is missing.");
    return Fail(kBadParameter);
  }
  const Json::Value& rules = params["rule"];
  if (!rules.isArray()) {
    LOG_ERROR("array variable 'rule' is missing.");
    return Fail(kBadParameter);
  }
  const Share share = LoadShare(name);
  if (!share) return Fail(kNoShare);
  if (!IsExportable(KLIBSharePathGet(share.get()))) return Fail(kShareNotExportable);
  return CheckRules(rules) || Fail(kBadParameter);
}

bool NFSSharePrivilegeHandler::SetData(const Json::Value& params) {
  const ExportRules list(Allocate<ExportRuleList>());
  if (!list) return Fail(kPlatformFailure);
  const Share share = LoadShare(params["share_name"]);
  if (!share) return Fail(kNoShare);
  // A longer path is cut: docs/decisions/0034.
  snprintf(list->path, sizeof list->path, "%s", KLIBSharePathGet(share.get()));
  if (!BuildRules(params["rule"], list.get()) || !WriteRules(*list)) return Fail(kPlatformFailure);
  // The result is ignored: docs/decisions/0024.
  static_cast<void>(KLIBServiceReload(kService));
  return true;
}
