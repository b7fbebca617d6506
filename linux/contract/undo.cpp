#include "undo.h"

#include <cerrno>
#include <map>
#include <memory>
#include <optional>
#include <utility>

#include "draft_store.h"
#include "exports_files.h"
#include "history.h"
#include "idmap.h"
#include "inverse_merge.h"
#include "keytab.h"
#include "nfs_configuration.h"
#include "platform_settings.h"
#include "shares.h"

namespace vorn {
namespace {

// A file as it is, and as it was before the change.
struct Planned {
  StoredFile now;
  std::optional<std::string> content;
};
using Plan = std::map<std::string, Planned>;  // by path; only files that change

Undone Refused(int result, Status reason) { return {result, {std::move(reason)}, {}}; }

// Adds a file to the plan. The result of `undone` says if it cannot.
void PlanFile(Box& box, const History::ChangedFile& file, Plan* plan, Undone* undone) {
  Result<StoredFile> now = box.Read(file.path);
  const auto refuse = [&](int result, Status reason) {
    undone->result = result;
    undone->reasons.push_back(std::move(reason));
  };
  if (!now.ok()) return refuse(VORN::kHistoryFailed, now.status());
  const std::optional<std::string> content = now->content();
  Result<InverseMerge> merged = MergeInverse(file.before, file.after, content);
  if (!merged.ok()) return refuse(VORN::kHistoryFailed, merged.status());
  if (merged->conflicts) {
    return refuse(VORN::kHistoryConflict, Status::Failure(kChangedBehind, file.path + ": " + merged->conflict));
  }
  if (merged->content != content) plan->emplace(file.path, Planned{std::move(*now), std::move(merged->content)});
}

Status Write(Box& box, const Plan& plan) {
  for (const auto& [path, file] : plan) {
    const Result<StoredFile> now = box.Read(path);
    if (!now.ok()) return now.status();
    Status status = file.content ? box.Replace(path, *file.content, now->version) : box.Remove(path, now->version);
    if (!status.ok()) return status;
  }
  return {};
}

Result<std::vector<ExportsFileFault>> ExportFaults(Box& box) {
  const Result<std::vector<SharedExportsFile>> files = OpenAllExports(box);
  if (!files.ok()) return files.status();
  return FindExportFaults(*files);
}

// Reads each configuration of the box as the operations do.
Status ReadAll(Box& box) {
  if (const auto idmap = ReadIDMap(box); !idmap.ok()) return idmap.status();
  if (const auto nfs = NFSConfiguration::Open(box); !nfs.ok()) return nfs.status();
  if (const auto settings = PlatformSettings::Load(box); !settings.ok()) return settings.status();
  const auto shares = ListShares(box);
  const bool is_readable = shares.ok() || shares.status().code() == ENOENT;
  return is_readable ? Status() : shares.status();
}

// Whether the files read well after the change. A fault that is there already does not count.
Status Check(Box& box, const Plan& plan) {
  std::vector<RehearsedAction> actions;
  const auto no_engine = [](Box&) -> Result<Engine*> { return Status::Failure(EROFS, "a check drives no service"); };
  Box trial(box.root(), std::make_unique<DraftStore>(box.store()), no_engine, &actions);
  if (Status status = Write(trial, plan); !status.ok()) return status;
  if (Status status = ReadAll(trial); !status.ok()) return status;
  const auto before = ExportFaults(box);
  const auto after = ExportFaults(trial);
  if (!before.ok()) return before.status();
  if (!after.ok()) return after.status();
  if (after->size() <= before->size()) return {};
  return Status::Failure(kSyntax, after->back().sentence);
}

// Whether changes of this kind can be taken back.
Status CheckKind(const History::Change& change, const std::vector<History::ChangedFile>& files) {
  if (change.message.kind == kFound) return Status::Failure(kUnsupported, "the content before it is not known");
  if (files.empty()) return Status::Failure(kUnsupported, "the change is of no file");
  for (const History::ChangedFile& file : files) {
    if (file.path != kKeytabFile) continue;
    return Status::Failure(kUnsupported, "the history has no keys: import the former keytab instead");
  }
  return {};
}

}  // namespace

Undone Undo(Box& box, History& history, const std::string& id) {
  const Result<History::Change> change = history.Read(id);
  if (!change.ok()) {
    const bool is_unknown = change.status().code() == ENOENT;
    return Refused(is_unknown ? VORN::kHistoryNoChange : VORN::kHistoryFailed, change.status());
  }
  const auto files = history.FilesOf(*change);
  if (!files.ok()) {
    const bool is_cut = files.status().code() == kUnsupported;
    return Refused(is_cut ? VORN::kHistoryFixed : VORN::kHistoryFailed, files.status());
  }
  if (Status status = CheckKind(*change, *files); !status.ok()) return Refused(VORN::kHistoryFixed, std::move(status));
  Plan plan;
  Undone undone;
  for (const History::ChangedFile& file : *files) PlanFile(box, file, &plan, &undone);
  if (undone.result != 0) return undone;
  if (plan.empty()) {
    return Refused(VORN::kHistoryUndone, Status::Failure(kUnsupported, "the files are as they were before the change"));
  }
  if (Status status = Check(box, plan); !status.ok()) return Refused(VORN::kHistoryFaulty, std::move(status));
  if (!box.is_draft()) history.NoteUndo(id);
  if (Status status = Write(box, plan); !status.ok()) return Refused(VORN::kHistoryFailed, std::move(status));
  for (const auto& file : plan) undone.files.push_back(file.first);
  return undone;
}

}  // namespace vorn
