#include "idmap.h"

#include <cstdio>
#include <cstring>
#include <string>
#include <string_view>
#include <vector>

#include "json_text.h"
#include "log.h"
#include "owned.h"
#include "page.h"
#include "service.h"
#include "user.h"

namespace {

constexpr char kSource[] = "idmap";
constexpr char kIDMapFile[] = "/etc/idmapd.conf";
constexpr char kKerberosFile[] = "/etc/nfs/krb5.conf";
constexpr int kCapacity = 1024;

// Returns the member `key` of an object, or null if the value is not an object or has no such member.
const Json::Value& Member(const Json::Value& value, const char* key) {
  return value.isObject() ? value[key] : Json::Value::nullSingleton();
}

bool IsText(const Json::Value& value) { return !TextOf(value).value_or("").empty(); }

bool IsIntegerOrAbsent(const Json::Value& value) { return value.isNull() || value.isInt(); }

// ------------------------------------------------------------------------------------- listing

bool CheckListing(const Json::Value& params, bool is_filter_accepted) {
  if (IsIntegerOrAbsent(params["offset"]) && IsIntegerOrAbsent(params["limit"]) && is_filter_accepted) return true;
  LOG_ERROR("Invalid type of input.");
  return false;
}

Page PageOf(const Json::Value& params, int count) {
  const Json::Value& limit = params["limit"];
  return Page::Of(count, params["offset"].asInt(), limit.isNull() ? -1 : limit.asInt());
}

Json::Value ItemOf(const char* principal, const char* local_name) {
  Json::Value item;
  item["id"] = principal;
  item["kerberos_principal"] = principal;
  item["local_name"] = local_name;
  return item;
}

// Returns the item at `index`. Logs a failure and returns nullptr.
const char* ItemAt(const KLIBSZLIST* list, int index) {
  const char* const item = KLIBCSzListGet(list, index);
  if (item == nullptr) LOG_ERROR("Failed to KLIBCSzListGet, vornerr=[0x%04X]", KLIBCErrGet());
  return item;
}

bool ReadMappings(const Json::Value& filter, StringHash* mappings, StringList* keys) {
  if (VORNNFSStaticMapGet(mappings->slot(), filter.isNull() ? nullptr : filter.asCString()) < 0) {
    LOG_ERROR("Failed to VORNNFSStaticMapGet, vornerr=[0x%04X]", KLIBCErrGet());
    return false;
  }
  if (KLIBCSzHashEnumKey(mappings->get(), keys->slot()) < 0) {
    LOG_ERROR("Failed to KLIBCSzHashEnumKey, vornerr=[0x%04X]", KLIBCErrGet());
    return false;
  }
  static_cast<void>(KLIBCSzListSortItems(keys->get(), KLIBSZLIST_SORT_TEXT));
  return true;
}

// Returns the mappings of a page. A mapping that cannot be read is logged and left out (docs/decisions/0026).
Json::Value MappingItems(const KLIBSZHASH* mappings, const KLIBSZLIST* keys, const Page& page) {
  Json::Value items(Json::arrayValue);
  for (int i = page.begin; i < page.end; ++i) {
    const char* const principal = ItemAt(keys, i);
    if (principal == nullptr) continue;
    const char* const local_name = KLIBCSzHashGetValue(mappings, principal);
    if (local_name == nullptr) {
      LOG_ERROR("Failed to KLIBCSzHashGetValue.");
      continue;
    }
    items.append(ItemOf(principal, local_name));
  }
  return items;
}

// Returns one suggestion per user of the page, whether the user is mapped or not (docs/decisions/0027).
Json::Value SuggestedItems(const KLIBSZLIST* users, const char* realm, const Page& page) {
  Json::Value items(Json::arrayValue);
  for (int i = page.begin; i < page.end; ++i) {
    const char* const user = ItemAt(users, i);
    if (user == nullptr) continue;
    char principal[1024];
    snprintf(principal, sizeof principal, "%s@%s", user, realm);
    items.append(ItemOf(principal, user));
  }
  return items;
}

// Lists the users whose name contains the filter. Its caller records no error code: docs/decisions/0025.
bool EnumerateSuggested(const std::string& filter, StringList* users) {
  if (filter.empty()) {
    if (VORNUserEnum(users->slot(), VORNUSER_LOCAL) >= 0) return true;
    LOG_ERROR("VORNUserEnum Failed, vornerr=[0x%04X]", KLIBCErrGet());
    return false;
  }
  if (VORNUserEnumBySubstr(users->slot(), VORNUSER_LOCAL, filter.c_str(), 1) >= 0) return true;
  LOG_ERROR("VORNUserEnumBySubstr Failed, vornerr=[0x%04X]", KLIBCErrGet());
  return false;
}

// ------------------------------------------------------------------------------------ changing

// Appends the local users to the list. Logs a failure, also that of an allocation that left the list empty.
bool EnumerateUsers(StringList* users) {
  if (!*users) {
    LOG_ERROR("Failed to KLIBCSzListAlloc.");
    return false;
  }
  if (VORNUserEnum(users->slot(), VORNUSER_LOCAL) >= 0) return true;
  LOG_ERROR("Failed to VORNUserEnum.");
  return false;
}

bool CheckLocalUser(const KLIBSZLIST* users, const std::string& name) {
  if (KLIBCSzListFind(users, name.c_str()) >= 0 || name == "root") return true;
  LOG_ERROR("'local_name' should be local user.");
  return false;
}

bool CheckPrincipalSymbols(const Json::Value& principal) {
  if (TextOf(principal).value_or("").find('=') == std::string_view::npos) return true;
  LOG_ERROR("KERBEROS_PRINCIPAL:%s contains invalid symbol \"=\"", principal.asCString());
  return false;
}

// Returns kNoError if the mapping may be created. Otherwise logs the reason and returns its error code.
int CheckMapping(const Json::Value& mapping, const KLIBSZLIST* users) {
  const Json::Value& principal = Member(mapping, "kerberos_principal");
  if (!IsText(principal)) {
    LOG_ERROR("string variable 'kerberos_principal' is missing or empty in idmap.");
    return kBadParameter;
  }
  if (!CheckPrincipalSymbols(principal)) return kPrincipalSymbol;
  const Json::Value& local_name = Member(mapping, "local_name");
  if (!IsText(local_name)) {
    LOG_ERROR("string variable 'local_name' is missing or empty in idmap.");
    return kBadParameter;
  }
  return CheckLocalUser(users, local_name.asString()) ? kNoError : kNoLocalUser;
}

// Returns the stored ID map. Logs a failure and returns nullptr.
IDMap GetIDMap() {
  IDMap record(VORNNFSIDMapGet());
  if (record == nullptr) LOG_ERROR("Failed to VORNNFSIDMapGet, vornerr=[0x%04X]", KLIBCErrGet());
  return record;
}

// Returns the stored ID map with its table. Logs a failure or a missing table and returns nullptr.
IDMap GetIDMapWithTable() {
  IDMap record(VORNNFSIDMapGet());
  if (record != nullptr && record->table != nullptr) return record;
  LOG_ERROR("Failed to VORNNFSIDMapGet, vornerr=[0x%04X]", KLIBCErrGet());
  return nullptr;
}

// Puts the new mappings into `pairs` and returns their principals. A mapping that cannot be stored is logged
// and left out of both (docs/decisions/0028).
Json::Value CollectPairs(const Json::Value& idmap, StringHash* pairs) {
  Json::Value ids(Json::arrayValue);
  for (const Json::Value& mapping : idmap) {
    const char* const principal = mapping["kerberos_principal"].asCString();
    if (KLIBCSzHashSetValue(pairs->slot(), principal, mapping["local_name"].asCString()) < 0) {
      LOG_ERROR("Failed to KLIBCSzHashSetValue.");
      continue;
    }
    ids.append(principal);
  }
  return ids;
}

// Removes the mapping `id` from the table. Logs and returns false if there is none.
bool RemoveOldMapping(KLIBSZHASH* table, const char* id) {
  if (KLIBCSzHashRemoveKey(table, id) != 0) return true;
  LOG_ERROR("remove old principal id failed.");
  return false;
}

bool CheckNewPrincipal(const KLIBSZHASH* table, const char* principal) {
  if (KLIBCSzHashGetValue(table, principal) == nullptr) return true;
  LOG_ERROR("new principal conflict.");
  return false;
}

// Collects the strings of `id`, a string or an array. Logs and returns false if an element is not a string.
bool CollectIDs(const Json::Value& id, std::vector<std::string>* texts) {
  if (id.isString()) {
    texts->push_back(id.asString());
    return true;
  }
  for (const Json::Value& element : id) {
    if (!element.isString()) {
      LOG_ERROR("variable 'id' should be string array or string.");
      return false;
    }
    texts->push_back(element.asString());
  }
  return true;
}

// Appends the ids to the list. An id that cannot be appended is logged and left out: its mapping stays.
void PushIDs(const std::vector<std::string>& ids, StringList* principals) {
  for (const std::string& id : ids) {
    if (KLIBCSzListPush(principals->slot(), id.c_str()) >= 0) continue;
    LOG_ERROR("KLIBCSzListPush Failed, vornerr=[0x%04X]", KLIBCErrGet());
  }
}

}  // namespace

void NFSIDMapServiceHandler::AnswerStep(const CallSite& site, const Step& step) {
  const Json::Value params = Parameters();
  Json::Value result;
  if (step(params, result)) return ReportSuccess(result);
  ReportError(result);
  LogRequest(site, params);
}

void NFSIDMapServiceHandler::List() {
  AnswerStep(HERE, [this](const Json::Value& params, Json::Value& result) { return ListEither(params, result); });
}

void NFSIDMapServiceHandler::Create() {
  AnswerStep(HERE, [this](const Json::Value& params, Json::Value& result) { return CreateIDMap(params, result); });
}

void NFSIDMapServiceHandler::Set() {
  AnswerStep(HERE, [this](const Json::Value& params, Json::Value& result) { return SetIDMap(params, result); });
}

void NFSIDMapServiceHandler::Delete() {
  AnswerStep(HERE, [this](const Json::Value& params, Json::Value& /*result*/) { return DeleteIDMap(params); });
}

bool NFSIDMapServiceHandler::ListEither(const Json::Value& params, Json::Value& result) {
  const Json::Value& suggestion = params["suggestion"];
  if (!suggestion.isNull() && !suggestion.isBool()) {
    LOG_ERROR("Invalid type of input.");
    return Fail(kBadParameter);
  }
  return suggestion.asBool() ? ListDefaultIDMap(params, result) : ListIDMap(params, result);
}

bool NFSIDMapServiceHandler::ListIDMap(const Json::Value& params, Json::Value& result) {
  const Json::Value& filter = params["filter"];
  if (!CheckListing(params, filter.isNull() || filter.isString())) return Fail(kBadParameter);
  StringHash mappings(KLIBCSzHashAlloc(kCapacity));
  if (!mappings) {
    LOG_ERROR("Failed to KLIBCSzHashAlloc, vornerr=[0x%04X]", KLIBCErrGet());
    return Fail(kPlatformFailure);
  }
  StringList keys(KLIBCSzListAlloc(kCapacity));
  if (!keys) {
    LOG_ERROR("Failed to KLIBCSzListAlloc, vornerr=[0x%04X]", KLIBCErrGet());
    return Fail(kPlatformFailure);
  }
  if (!ReadMappings(filter, &mappings, &keys)) return Fail(kPlatformFailure);
  const int count = keys.get()->count;
  result["idmap"] = MappingItems(mappings.get(), keys.get(), PageOf(params, count));
  result["total"] = count;
  return true;
}

bool NFSIDMapServiceHandler::ListDefaultIDMap(const Json::Value& params, Json::Value& result) {
  const Json::Value& filter = params["filter"];
  if (!CheckListing(params, filter.isNull() || filter.isString() || filter.isInt())) return Fail(kBadParameter);
  StringList users(KLIBCSzListAlloc(kCapacity));
  if (!users) {
    LOG_ERROR("Failed to KLIBCSzListAlloc, vornerr=[0x%04X]", KLIBCErrGet());
    return Fail(kPlatformFailure);
  }
  char realm[512];
  if (KLIBCFileGetSectionValue(kKerberosFile, "libdefaults", "default_realm", realm, sizeof realm) < 0) {
    LOG_ERROR("KLIBCFileGetKeyValue, vornerr=[0x%04X]", KLIBCErrGet());
    return Fail(kPlatformFailure);
  }
  if (!EnumerateSuggested(filter.asString(), &users)) return false;
  if (!AddRootToList(users.slot(), filter.asString())) {
    LOG_ERROR("AddRootToList Failed");
    return Fail(kPlatformFailure);
  }
  const int count = users.get()->count;
  result["idmap"] = SuggestedItems(users.get(), realm, PageOf(params, count));
  result["total"] = count;
  return true;
}

bool NFSIDMapServiceHandler::AddRootToList(KLIBSZLIST** list, const std::string& filter) {
  if (list == nullptr || *list == nullptr) {
    LOG_ERROR("Bad parameter");
    return false;
  }
  char upper[492] = {};
  if (!filter.empty() && KLIBCUnicodeUTF8StrUpper(filter.c_str(), upper, sizeof upper) < 0) {
    LOG_ERROR("KLIBCUnicodeUTF8StrUpper failed, str=[%s]", filter.c_str());
    return false;
  }
  // The empty string is contained in every string.
  if (strstr("ROOT", upper) != nullptr) static_cast<void>(KLIBCSzListInsert(list, 0, "root"));
  return true;
}

bool NFSIDMapServiceHandler::CheckIDMapInput(const Json::Value& idmap) {
  if (!idmap.isArray()) {
    LOG_ERROR("array variable 'idmap' is missing.");
    return Fail(kBadParameter);
  }
  StringList users(KLIBCSzListAlloc(kCapacity));
  if (!EnumerateUsers(&users)) return Fail(kPlatformFailure);
  for (const Json::Value& mapping : idmap) {
    const int error = CheckMapping(mapping, users.get());
    if (error != kNoError) return Fail(error);
  }
  return true;
}

bool NFSIDMapServiceHandler::GetConflictPrincipal(const Json::Value& idmap, Json::Value& conflicts, KLIBSZHASH* table) {
  Json::Value mapped(Json::arrayValue);
  for (const Json::Value& mapping : idmap) {
    const Json::Value& principal = mapping["kerberos_principal"];
    if (KLIBCSzHashGetValue(table, principal.asCString()) != nullptr) mapped.append(principal);
  }
  if (mapped.empty()) return false;
  conflicts = mapped;
  return true;
}

bool NFSIDMapServiceHandler::CreateIDMap(const Json::Value& params, Json::Value& result) {
  const Json::Value& idmap = params["idmap"];
  if (!CheckIDMapInput(idmap)) {
    LOG_ERROR("Wrong idmap input.");
    return Fail(kBadParameter);
  }
  StringHash pairs(KLIBCSzHashAlloc(kCapacity));
  if (!pairs) {
    LOG_ERROR("Failed to KLIBCSzHashAlloc, vornerr=[0x%04X]", KLIBCErrGet());
    return Fail(kPlatformFailure);
  }
  const IDMap record = GetIDMapWithTable();
  if (!record) return Fail(kPlatformFailure);
  Json::Value conflicts;
  if (GetConflictPrincipal(idmap, conflicts, record->table)) {
    result["principal_conflict"] = conflicts;
    LOG_ERROR("Conflict principal input.");
    return Fail(kPrincipalMapped);
  }
  const Json::Value ids = CollectPairs(idmap, &pairs);
  if (VORNNFSStaticMapAppend(&record->table, pairs.get()) < 0) {
    LOG_ERROR("Failed to VORNNFSStaticMapAppend, vornerr=[0x%04X]", KLIBCErrGet());
    return Fail(kPlatformFailure);
  }
  if (!SaveIDMapAndReloadIDMap(record.get())) return false;
  result["id"] = ids;
  return true;
}

bool NFSIDMapServiceHandler::SetIDMap(const Json::Value& params, Json::Value& /*result*/) {
  const Json::Value& id = params["id"];
  const Json::Value& principal = params["kerberos_principal"];
  const Json::Value& local_name = params["local_name"];
  if (!id.isString() || !IsText(principal) || !IsText(local_name)) {
    LOG_ERROR("string variable 'id', 'kerberos_principal', or 'local_name' are missing.");
    return Fail(kBadParameter);
  }
  if (!CheckPrincipalSymbols(principal)) return Fail(kPrincipalSymbol);
  const IDMap record = GetIDMapWithTable();
  // The old mapping is removed first, so that a request may keep the principal: docs/decisions/0029.
  if (!record || !RemoveOldMapping(record->table, id.asCString())) return Fail(kPlatformFailure);
  if (!CheckNewPrincipal(record->table, principal.asCString())) return Fail(kPrincipalMapped);
  StringList users(KLIBCSzListAlloc(kCapacity));
  if (!EnumerateUsers(&users)) return Fail(kPlatformFailure);
  if (!CheckLocalUser(users.get(), local_name.asString())) return Fail(kNoLocalUser);
  if (KLIBCSzHashSetValue(&record->table, principal.asCString(), local_name.asCString()) < 0) {
    LOG_ERROR("failed to add principal.");
    return Fail(kPlatformFailure);
  }
  return SaveIDMapAndReloadIDMap(record.get());
}

bool NFSIDMapServiceHandler::DeleteIDMap(const Json::Value& params) {
  const Json::Value& id = params["id"];
  if (id.isNull()) {
    LOG_ERROR("variable 'id' is missing.");
    return Fail(kBadParameter);
  }
  if (!id.isString() && !id.isArray()) {
    LOG_ERROR("variable 'id' should be string array or string.");
    return Fail(kBadParameter);
  }
  StringList principals(KLIBCSzListAlloc(kCapacity));
  if (!principals) {
    LOG_ERROR("KLIBCSzListAlloc Failed, vornerr=[0x%04X]", KLIBCErrGet());
    return Fail(kPlatformFailure);
  }
  std::vector<std::string> ids;
  if (!CollectIDs(id, &ids)) return Fail(kBadParameter);
  PushIDs(ids, &principals);
  const IDMap record = GetIDMap();
  if (!record) return Fail(kPlatformFailure);
  if (VORNNFSStaticMapRemove(record->table, principals.get()) < 0) {
    LOG_ERROR("VORNNFSStaticMapRemove Failed, vornerr=[0x%04X]", KLIBCErrGet());
    return Fail(kPlatformFailure);
  }
  return SaveIDMapAndReloadIDMap(record.get());
}

bool NFSIDMapServiceHandler::SaveIDMapAndReloadIDMap(_tag_nfs_id_map_* record) {
  const VornConf configuration;
  if (VORNNFSIDMapSet(kIDMapFile, record) < 0) {
    LOG_ERROR("Failed to VORNNFSIDMapSet, vornerr=[0x%04X]", KLIBCErrGet());
    return Fail(kPlatformFailure);
  }
  if (!ReloadIDMap()) {
    LOG_ERROR("Failed to KLIBCExec, vornerr=[0x%04X]", KLIBCErrGet());
    return Fail(kPlatformFailure);
  }
  return true;
}
