#include "history_handler.h"

#include <algorithm>
#include <cstdint>

#include "core.h"
#include "firewall.h"
#include "history.h"
#include "json_values.h"
#include "listing_page.h"
#include "log.h"
#include "parameter_reader.h"

namespace {

constexpr char kSource[] = "history_handler";
constexpr char kService[] = "nfsd";
constexpr char kScript[] = "/usr/vorn/etc/rc.sysv/S83nfsd.sh";
constexpr char kExportsFile[] = "/etc/exports";
constexpr char kIDMapFile[] = "/etc/idmapd.conf";
constexpr char kSettingsFile[] = "/etc/nfs.conf.d/vorn.conf";

VORN::HistoryFilter ReadFilter(ParameterReader& reader) {
  VORN::HistoryFilter filter;
  filter.file = reader.Text("file");
  filter.method = reader.Text("method");
  filter.caller = reader.Text("caller");
  filter.since = reader.Integer("since", filter.since, 0, INT64_MAX);
  filter.until = reader.Integer("until", filter.until, 0, INT64_MAX);
  return filter;
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
  item["files"] = ArrayOf(entry.files);
  item["actions"] = ArrayOf(entry.actions);
  return item;
}

Json::Value ToJson(const VORN::HistoryFile& file) {
  Json::Value item;
  item["path"] = file.path;
  item["difference"] = file.difference;
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
  ParameterReader reader(HERE, params);
  const VORN::HistoryFilter filter = ReadFilter(reader);
  const ListingPage page = ListingPage::Read(reader);
  if (!reader.ok()) return Fail(kBadParameter);
  std::vector<VORN::HistoryEntry> entries;
  int total = 0;
  if (VORN::ListHistory(filter, page.offset, page.limit, &entries, &total) < 0) {
    LOG_ERROR("Failed to ListHistory, vornerr=[0x%04X]", KLIBCErrGet());
    return Fail(kPlatformFailure);
  }
  result["changes"] = ArrayOf(entries, ToJson);
  result["total"] = total;
  return true;
}

bool HistoryHandler::ShowData(const Json::Value& params, Json::Value& result) {
  ParameterReader reader(HERE, params);
  const std::string id = reader.NeededText("id");
  if (!reader.ok()) return Fail(kBadParameter);
  VORN::HistoryEntry entry;
  std::vector<VORN::HistoryFile> files;
  const int shown = VORN::ShowHistory(id, &entry, &files);
  if (shown < 0) {
    LOG_ERROR("Failed to ShowHistory, vornerr=[0x%04X]", KLIBCErrGet());
    return Fail(CodeOf(shown));
  }
  result = ToJson(entry);
  result["differences"] = ArrayOf(files, ToJson);
  return true;
}

bool HistoryHandler::UndoData(const Json::Value& params) {
  ParameterReader reader(HERE, params);
  const std::string id = reader.NeededText("id");
  if (!reader.ok()) return Fail(kBadParameter);
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
