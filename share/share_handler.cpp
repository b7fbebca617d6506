#include "share_handler.h"

#include <cstring>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "core.h"
#include "json_text.h"
#include "log.h"
#include "nfsconf.h"
#include "owned.h"
#include "page.h"
#include "shared_folders.h"

namespace {

constexpr char kSource[] = "share_handler";
constexpr char kExportsFile[] = "/etc/exports";

bool LogFailure(const char* operation) {
  LOG_ERROR("Failed to %s, vornerr=[0x%04X]", operation, KLIBCErrGet());
  return false;
}

// Returns the parameter if it is a string with at least one character and no NUL, which no name or path has.
std::optional<std::string> TextParameter(const Json::Value& params, const char* name) {
  const std::optional<std::string_view> text = TextOf(params[name]);
  if (text && !text->empty() && text->find('\0') == std::string_view::npos) return std::string(*text);
  LOG_ERROR("string variable '%s' is missing or empty.", name);
  return std::nullopt;
}

bool ReadShares(StringHash* shares, StringList* names) {
  if (!*shares || !*names) return LogFailure("allocate");
  if (VORNShareEnum(shares->slot()) < 0) return LogFailure("VORNShareEnum");
  if (KLIBCSzHashEnumKey(shares->get(), names->slot()) < 0) return LogFailure("KLIBCSzHashEnumKey");
  static_cast<void>(KLIBCSzListSortItems(names->get(), KLIBSZLIST_SORT_TEXT));
  return true;
}

// A shared folder as it is listed. The pointers belong to the hash and the list of all folders.
struct Folder {
  const char* name;
  const char* path;
};

// strcasestr(3) ignores the case of ASCII letters.
bool Matches(const Folder& folder, const std::string& filter) {
  return strcasestr(folder.name, filter.c_str()) != nullptr || strcasestr(folder.path, filter.c_str()) != nullptr;
}

std::vector<Folder> MatchingFolders(const KLIBSZHASH* shares, const KLIBSZLIST* names, const std::string& filter) {
  std::vector<Folder> folders;
  for (int i = 0; i < names->count; ++i) {
    const char* const name = KLIBCSzListGet(names, i);
    const char* const path = name == nullptr ? nullptr : KLIBCSzHashGetValue(shares, name);
    if (path != nullptr && Matches({name, path}, filter)) folders.push_back({name, path});
  }
  return folders;
}

// Returns the number of export rules of the folder, or std::nullopt if they cannot be read. An entry that an
// administrator wrote with a relative path cannot have any.
std::optional<int> CountRules(const char* path) {
  if (path[0] != '/') return 0;
  ExportRuleList* list = nullptr;
  const int found = VORNNFSRuleExtGet(kExportsFile, path, &list);
  const ExportRules rules(list);
  if (found < 0) {
    LogFailure("VORNNFSRuleExtGet");
    return std::nullopt;
  }
  int count = 0;
  for (const ExportRule* rule = found == 0 || !rules ? nullptr : rules->first; rule != nullptr; rule = rule->next) {
    ++count;
  }
  return count;
}

// Returns null if the rules cannot be read.
Json::Value ToJson(const Folder& folder) {
  const std::optional<int> rules = CountRules(folder.path);
  if (!rules) return {};
  Json::Value item;
  item["name"] = folder.name;
  item["path"] = folder.path;
  item["rules"] = *rules;
  return item;
}

bool CheckListing(const Json::Value& params) {
  const auto is_integer_or_absent = [&](const char* name) { return params[name].isNull() || params[name].isInt(); };
  const bool has_filter = params["filter"].isNull() || params["filter"].isString();
  if (is_integer_or_absent("offset") && is_integer_or_absent("limit") && has_filter) return true;
  LOG_ERROR("Invalid type of input.");
  return false;
}

int CodeOf(int result) {
  if (result == VORNSHARE_EXISTS) return kShareExists;
  if (result == VORNSHARE_NO_FOLDER) return kNoFolder;
  if (result == VORNSHARE_NO_SHARE) return kNoShare;
  return kPlatformFailure;
}

}  // namespace

void ShareHandler::List() {
  AnswerWith(HERE, [this](Json::Value& result) { return ListData(Parameters(), result); });
}

void ShareHandler::Get() {
  AnswerWith(HERE, [this](Json::Value& result) { return GetData(Parameters(), result); });
}

void ShareHandler::Create() {
  AnswerTo(HERE, [this](const Json::Value& params) { return CreateData(params); });
}

void ShareHandler::Delete() {
  AnswerTo(HERE, [this](const Json::Value& params) { return DeleteData(params); });
}

bool ShareHandler::ListData(const Json::Value& params, Json::Value& result) {
  if (!CheckListing(params)) return Fail(kBadParameter);
  StringHash shares(KLIBCSzHashAlloc(0));
  StringList names(KLIBCSzListAlloc(0));
  if (!ReadShares(&shares, &names)) return Fail(kPlatformFailure);
  const std::vector<Folder> folders = MatchingFolders(shares.get(), names.get(), params["filter"].asString());
  const int count = static_cast<int>(folders.size());
  const int limit = params["limit"].isNull() ? -1 : params["limit"].asInt();
  const Page page = Page::Of(count, params["offset"].asInt(), limit);
  Json::Value items(Json::arrayValue);
  for (int i = page.begin; i < page.end; ++i) {
    items.append(ToJson(folders[static_cast<std::size_t>(i)]));
    if (items[items.size() - 1].isNull()) return Fail(kPlatformFailure);
  }
  result["shares"] = items;
  result["total"] = count;
  return true;
}

bool ShareHandler::GetData(const Json::Value& params, Json::Value& result) {
  const std::optional<std::string> name = TextParameter(params, "name");
  if (!name) return Fail(kBadParameter);
  StringHash shares(KLIBCSzHashAlloc(0));
  StringList names(KLIBCSzListAlloc(0));
  if (!ReadShares(&shares, &names)) return Fail(kPlatformFailure);
  const char* const path = KLIBCSzHashGetValue(shares.get(), name->c_str());
  if (path == nullptr) return Fail(kNoShare);
  result = ToJson({name->c_str(), path});
  return !result.isNull() || Fail(kPlatformFailure);
}

bool ShareHandler::CreateData(const Json::Value& params) {
  const std::optional<std::string> name = TextParameter(params, "name");
  const std::optional<std::string> path = TextParameter(params, "path");
  if (!name || !path) return Fail(kBadParameter);
  const int created = VORNShareCreate(name->c_str(), path->c_str());
  if (created >= 0) return true;
  LogFailure("VORNShareCreate");
  return Fail(CodeOf(created));
}

bool ShareHandler::DeleteData(const Json::Value& params) {
  const std::optional<std::string> name = TextParameter(params, "name");
  if (!name) return Fail(kBadParameter);
  const VornConf configuration;  // nobody adds a rule between the check and the removal
  StringHash shares(KLIBCSzHashAlloc(0));
  StringList names(KLIBCSzListAlloc(0));
  if (!ReadShares(&shares, &names)) return Fail(kPlatformFailure);
  const char* const path = KLIBCSzHashGetValue(shares.get(), name->c_str());
  if (path == nullptr) return Fail(kNoShare);
  const std::optional<int> rules = CountRules(path);
  if (!rules) return Fail(kPlatformFailure);
  if (*rules > 0) {
    LOG_ERROR("The shared folder has export rules.");
    return Fail(kShareHasRules);
  }
  const int deleted = VORNShareDelete(name->c_str());
  if (deleted >= 0) return true;
  LogFailure("VORNShareDelete");
  return Fail(CodeOf(deleted));
}
