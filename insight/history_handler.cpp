#include "history_handler.h"

#include <algorithm>
#include <cstdint>
#include <optional>
#include <string_view>

#include "core.h"
#include "firewall.h"
#include "history.h"
#include "json_text.h"
#include "log.h"

namespace {

constexpr char kSource[] = "history_handler";
constexpr char kService[] = "nfsd";
constexpr char kScript[] = "/usr/vorn/etc/rc.sysv/S83nfsd.sh";
constexpr char kExportsFile[] = "/etc/exports";
constexpr char kIDMapFile[] = "/etc/idmapd.conf";
constexpr char kSettingsFile[] = "/etc/nfs.conf.d/vorn.conf";
constexpr int kMostChanges = 1000;  // of a page
constexpr int kUsualChanges = 50;

// Reads a string without NUL bytes; an absent one is empty.
bool ReadText(const Json::Value& params, const char* name, std::string* text) {
  if (params[name].isNull()) return true;
  const std::optional<std::string_view> given = TextOf(params[name]);
  if (!given || given->find('\0') != std::string_view::npos) {
    LOG_ERROR("variable '%s' is no string.", name);
    return false;
  }
  *text = *given;
  return true;
}

// Reads an integer from 0 to `most`. An absent one leaves `number` as it is.
bool ReadNumber(const Json::Value& params, const char* name, std::int64_t most, std::int64_t* number) {
  const Json::Value& given = params[name];
  if (given.isNull()) return true;
  if (!given.isInt64() || given.asInt64() < 0 || given.asInt64() > most) {
    LOG_ERROR("variable '%s' is not accepted.", name);
    return false;
  }
  *number = given.asInt64();
  return true;
}

bool ReadFilter(const Json::Value& params, VORN::HistoryFilter* filter) {
  return ReadText(params, "file", &filter->file) && ReadText(params, "method", &filter->method) &&
         ReadText(params, "caller", &filter->caller) && ReadNumber(params, "since", INT64_MAX, &filter->since) &&
         ReadNumber(params, "until", INT64_MAX, &filter->until);
}

// Reads the id of a change, which must not be empty.
bool ReadID(const Json::Value& params, std::string* id) {
  if (!ReadText(params, "id", id)) return false;
  if (!id->empty()) return true;
  LOG_ERROR("variable 'id' is missing.");
  return false;
}

Json::Value OrNull(const std::string& text) { return text.empty() ? Json::Value() : Json::Value(text); }

Json::Value ToArray(const std::vector<std::string>& texts) {
  Json::Value array(Json::arrayValue);
  for (const std::string& text : texts) array.append(text);
  return array;
}

Json::Value ToJson(const VORN::HistoryEntry& entry) {
  Json::Value item;
  item["id"] = entry.id;
  item["time"] = Json::Int64{entry.time};
  item["kind"] = entry.kind;
  item["caller"] = OrNull(entry.caller);
  item["origin"] = OrNull(entry.origin);
  item["method"] = OrNull(entry.method);
  item["parameters"] = OrNull(entry.parameters);
  item["undoes"] = OrNull(entry.undoes);
  item["files"] = ToArray(entry.files);
  item["actions"] = ToArray(entry.actions);
  return item;
}

int CodeOf(int result) {
  switch (result) {
    case VORN::kHistoryNoChange:
      return kNoChange;
    case VORN::kHistoryConflict:
      return kUndoConflict;
    case VORN::kHistoryFaulty:
      return kUndoFaulty;
    case VORN::kHistoryFixed:
      return kUndoImpossible;
    case VORN::kHistoryUndone:
      return kUndoneAlready;
    default:
      return kPlatformFailure;
  }
}

bool Has(const std::vector<std::string>& files, const char* file) {
  return std::find(files.begin(), files.end(), file) != files.end();
}

}  // namespace

void HistoryHandler::List() {
  AnswerWith(HERE, [this](Json::Value& result) { return ListData(Parameters(), result); });
}

void HistoryHandler::Show() {
  AnswerWith(HERE, [this](Json::Value& result) { return ShowData(Parameters(), result); });
}

void HistoryHandler::Undo() {
  AnswerTo(HERE, [this](const Json::Value& params) { return UndoData(params); });
}

bool HistoryHandler::ListData(const Json::Value& params, Json::Value& result) {
  VORN::HistoryFilter filter;
  std::int64_t offset = 0;
  std::int64_t limit = kUsualChanges;
  if (!ReadFilter(params, &filter) || !ReadNumber(params, "offset", INT32_MAX, &offset) ||
      !ReadNumber(params, "limit", kMostChanges, &limit)) {
    return Fail(kBadParameter);
  }
  std::vector<VORN::HistoryEntry> entries;
  int total = 0;
  if (VORN::ListHistory(filter, static_cast<int>(offset), static_cast<int>(limit), &entries, &total) < 0) {
    LOG_ERROR("Failed to ListHistory, vornerr=[0x%04X]", KLIBCErrGet());
    return Fail(kPlatformFailure);
  }
  result["changes"] = Json::Value(Json::arrayValue);
  for (const VORN::HistoryEntry& entry : entries) result["changes"].append(ToJson(entry));
  result["total"] = total;
  return true;
}

bool HistoryHandler::ShowData(const Json::Value& params, Json::Value& result) {
  std::string id;
  if (!ReadID(params, &id)) return Fail(kBadParameter);
  VORN::HistoryEntry entry;
  std::vector<VORN::HistoryFile> files;
  const int shown = VORN::ShowHistory(id, &entry, &files);
  if (shown < 0) {
    LOG_ERROR("Failed to ShowHistory, vornerr=[0x%04X]", KLIBCErrGet());
    return Fail(CodeOf(shown));
  }
  result = ToJson(entry);
  result["differences"] = Json::Value(Json::arrayValue);
  for (const VORN::HistoryFile& file : files) {
    Json::Value item;
    item["path"] = file.path;
    item["difference"] = file.difference;
    result["differences"].append(item);
  }
  return true;
}

bool HistoryHandler::UndoData(const Json::Value& params) {
  std::string id;
  if (!ReadID(params, &id)) return Fail(kBadParameter);
  const VornConf configuration;
  std::vector<std::string> files;
  const int undone = VORN::UndoChange(id, &files);
  if (undone < 0) {
    LOG_ERROR("Failed to UndoChange, vornerr=[0x%04X]", KLIBCErrGet());
    return Fail(CodeOf(undone));
  }
  return Apply(files);
}

// Does what the methods do that change these files. A rule that cannot be reloaded fails no save: docs/decisions/0024.
bool HistoryHandler::Apply(const std::vector<std::string>& files) {
  if (Has(files, kExportsFile)) static_cast<void>(KLIBServiceReload(kService));
  const bool is_enabled = KLIBServiceIsEnabled(kService) != 0;
  if (Has(files, kSettingsFile)) {
    if (is_enabled && KLIBServiceRestart(kService) != 0) {
      LOG_ERROR("Failed to KLIBServiceRestart, vornerr=[0x%04X]", KLIBCErrGet());
      return Fail(kPlatformFailure);
    }
    if (VORNFwRuleHup() < 0) LOG_ERROR("Failed to reload firewall rules");
  }
  if (Has(files, kIDMapFile) && is_enabled && KLIBCExec(kScript, "reloadidmap", nullptr, nullptr, nullptr) < 0) {
    LOG_ERROR("Failed to KLIBCExec, vornerr=[0x%04X]", KLIBCErrGet());
    return Fail(kPlatformFailure);
  }
  return true;
}
