#include "history.h"

#include <algorithm>
#include <cerrno>
#include <optional>
#include <utility>

#include "change_history.h"
#include "configuration_lock.h"
#include "current_box.h"
#include "error.h"
#include "undo.h"
#include "unicode.h"
#include "unified_diff.h"

namespace vorn {
namespace {

VORN::HistoryEntry Describe(const History::Change& change) {
  const ChangeMessage& message = change.message;
  return {change.id,      change.time,        message.kind,   message.caller, message.origin,
          message.method, message.parameters, message.undoes, message.files,  message.actions};
}

bool Matches(const VORN::HistoryFilter& filter, const History::Change& change) {
  const std::vector<std::string>& files = change.message.files;
  return (filter.file.empty() || std::find(files.begin(), files.end(), filter.file) != files.end()) &&
         change.message.method.find(filter.method) != std::string::npos &&
         (filter.caller.empty() || change.message.caller == filter.caller) &&
         (filter.since == 0 || change.time >= filter.since) && (filter.until == 0 || change.time <= filter.until);
}

VORN::HistoryFile Describe(const History::ChangedFile& file) {
  return {ToValidUtf8(file.path), ToValidUtf8(UnifiedDiff(file.path, file.before, file.after))};
}

int CodeOf(const Status& status) { return status.code() == ENOENT ? VORN::kHistoryNoChange : VORN::kHistoryFailed; }

}  // namespace
}  // namespace vorn

namespace VORN {

int ListHistory(const HistoryFilter& filter, int offset, int limit, std::vector<HistoryEntry>* entries, int* total) {
  entries->clear();
  *total = 0;
  const auto status = vorn::RealHistory().Walk([&](const vorn::History::Change& change) {
    if (!vorn::Matches(filter, change)) return true;
    if (*total >= offset && static_cast<int>(entries->size()) < limit) entries->push_back(vorn::Describe(change));
    ++*total;
    return true;
  });
  return vorn::ToResult(status);
}

int ShowHistory(const std::string& id, HistoryEntry* entry, std::vector<HistoryFile>* files) {
  const auto change = vorn::RealHistory().Read(id);
  if (vorn::ToResult(change.status()) < 0) return vorn::CodeOf(change.status());
  *entry = vorn::Describe(*change);
  files->clear();
  const auto contents = vorn::RealHistory().FilesOf(*change);
  if (contents.status().code() == vorn::kUnsupported) return 0;  // what was before it is not known any more
  if (vorn::ToResult(contents.status()) < 0) return kHistoryFailed;
  for (const auto& file : *contents) files->push_back(vorn::Describe(file));
  return 0;
}

int UndoChange(const std::string& id, std::vector<std::string>* files) {
  vorn::Box& box = vorn::CurrentBox();
  const vorn::ConfigurationLock lock(box);
  if (vorn::ToResult(lock.status()) < 0) return kHistoryFailed;
  vorn::Undone undone = vorn::Undo(box, vorn::RealHistory(), id);
  for (const vorn::Status& reason : undone.reasons) vorn::ToResult(reason);
  *files = std::move(undone.files);
  return undone.result;
}

}  // namespace VORN
