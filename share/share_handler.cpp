#include "share_handler.h"

#include <algorithm>
#include <cstring>
#include <optional>
#include <string>
#include <vector>

#include "core.h"
#include "folder_listing.h"
#include "log.h"
#include "nfsconf.h"
#include "owned.h"
#include "page.h"
#include "parameter_reader.h"
#include "shared_folders.h"

namespace {

constexpr char kSource[] = "share_handler";
constexpr char kExportsFile[] = "/etc/exports";

bool LogFailure(const char* operation) {
  LOG_ERROR("Failed to %s, vornerr=[0x%04X]", operation, KLIBCErrGet());
  return false;
}

// strcasestr(3) ignores the case of ASCII letters.
bool Matches(const Folder& folder, const std::string& filter) {
  return strcasestr(folder.name.c_str(), filter.c_str()) != nullptr ||
         strcasestr(folder.path.c_str(), filter.c_str()) != nullptr;
}

// Returns the folder with exactly this name; null if there is none. The folders are sorted by name.
const Folder* Find(const std::vector<Folder>& folders, const std::string& name) {
  const auto found =
      std::lower_bound(folders.begin(), folders.end(), name,
                       [](const Folder& folder, const std::string& wanted) { return folder.name < wanted; });
  return found != folders.end() && found->name == name ? &*found : nullptr;
}

// Returns the number of export rules of the folder, or std::nullopt if they cannot be read. An entry that an
// administrator wrote with a relative path cannot have any.
std::optional<int> CountRules(const std::string& path) {
  if (path.empty() || path.front() != '/') return 0;
  ExportRuleList* list = nullptr;
  const int found = VORNNFSRuleExtGet(kExportsFile, path.c_str(), &list);
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
  ParameterReader reader(HERE, params);
  const std::string filter = reader.Text("filter");
  const int offset = reader.Integer("offset", 0);
  const int limit = reader.Integer("limit", -1);
  if (!reader.ok()) return Fail(kBadParameter);
  std::optional<std::vector<Folder>> folders = ReadFolders(HERE);
  if (!folders) return Fail(kPlatformFailure);
  folders->erase(std::remove_if(folders->begin(), folders->end(), [&](const Folder& f) { return !Matches(f, filter); }),
                 folders->end());
  const int count = static_cast<int>(folders->size());
  const Page page = Page::Of(count, offset, limit);
  Json::Value items(Json::arrayValue);
  for (int i = page.begin; i < page.end; ++i) {
    items.append(ToJson((*folders)[static_cast<std::size_t>(i)]));
    if (items[items.size() - 1].isNull()) return Fail(kPlatformFailure);
  }
  result["shares"] = items;
  result["total"] = count;
  return true;
}

bool ShareHandler::GetData(const Json::Value& params, Json::Value& result) {
  ParameterReader reader(HERE, params);
  const std::string name = reader.NeededText("name");
  if (!reader.ok()) return Fail(kBadParameter);
  const std::optional<std::vector<Folder>> folders = ReadFolders(HERE);
  if (!folders) return Fail(kPlatformFailure);
  const Folder* const folder = Find(*folders, name);
  if (folder == nullptr) return Fail(kNoShare);
  result = ToJson(*folder);
  return !result.isNull() || Fail(kPlatformFailure);
}

bool ShareHandler::CreateData(const Json::Value& params) {
  ParameterReader reader(HERE, params);
  const std::string name = reader.NeededText("name");
  const std::string path = reader.NeededText("path");
  if (!reader.ok()) return Fail(kBadParameter);
  const int created = VORNShareCreate(name.c_str(), path.c_str());
  if (created >= 0) return true;
  LogFailure("VORNShareCreate");
  return Fail(CodeOf(created));
}

bool ShareHandler::DeleteData(const Json::Value& params) {
  ParameterReader reader(HERE, params);
  const std::string name = reader.NeededText("name");
  if (!reader.ok()) return Fail(kBadParameter);
  const VornConf configuration;  // nobody adds a rule between the check and the removal
  const std::optional<std::vector<Folder>> folders = ReadFolders(HERE);
  if (!folders) return Fail(kPlatformFailure);
  const Folder* const folder = Find(*folders, name);
  if (folder == nullptr) return Fail(kNoShare);
  const std::optional<int> rules = CountRules(folder->path);
  if (!rules) return Fail(kPlatformFailure);
  if (*rules > 0) {
    LOG_ERROR("The shared folder has export rules.");
    return Fail(kShareHasRules);
  }
  const int deleted = VORNShareDelete(name.c_str());
  if (deleted >= 0) return true;
  LogFailure("VORNShareDelete");
  return Fail(CodeOf(deleted));
}
