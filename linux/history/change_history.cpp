#include "change_history.h"

#include <malloc.h>
#include <unistd.h>

#include <algorithm>
#include <atomic>
#include <cerrno>
#include <chrono>
#include <cstdlib>
#include <new>
#include <set>
#include <utility>

#include "call.h"
#include "files.h"
#include "notice.h"

namespace vorn {
namespace {

using Record = HistoryJournal::Record;
using Kind = HistoryJournal::Record::Kind;
using Content = HistoryRepository::Content;

// A checkpoint is made after so many commits, or when the journal has grown so large.
constexpr std::size_t kMostCommits = 256;
constexpr off_t kLargestJournal = off_t{16} << 20;

constexpr char kNotYet[] = "A change is not in the history yet";
constexpr char kBootId[] = "/proc/sys/kernel/random/boot_id";

// The change that this thread is making.
struct Mine {
  std::string name;  // in the journal; empty before the first file
  std::string undoes;
  std::vector<std::string> actions;
  bool is_postponed = false;
};

std::map<const History*, Mine>& ChangesOfThread() {
  thread_local std::map<const History*, Mine> changes;
  return changes;
}

std::int64_t NanosecondsNow() {
  return std::chrono::duration_cast<std::chrono::nanoseconds>(std::chrono::system_clock::now().time_since_epoch())
      .count();
}

std::int64_t SecondsNow() { return NanosecondsNow() / 1'000'000'000; }

// No other change of this box has the name.
std::string NewName() {
  static std::atomic<unsigned> count{0};
  return std::to_string(getpid()) + "-" + std::to_string(++count) + "-" + std::to_string(NanosecondsNow());
}

std::string CurrentBoot() {
  const Result<FileText> file = ReadFile(kBootId);
  return file.ok() ? file->text : std::string();
}

std::string Located(const Root& root, const char* path) {
  const Result<std::string> location = root.Locate(path);
  return location.ok() ? *location : root.directory() + path;
}

bool IsRecorded(const std::string& path) { return path.rfind("/etc/", 0) == 0; }

ChangeMessage DescribeCaller() {
  ChangeMessage message;
  const VORN::CallContext* call = VORN::CallContext::Current();
  if (call == nullptr) {
    message.caller = program_invocation_short_name;
    message.origin = "local";
    return message;
  }
  message.caller = call->description().caller;
  message.origin = call->description().origin;
  message.method = call->description().method;
  message.parameters = call->description().parameters;
  return message;
}

// A missing file differs from an empty one.
std::string Encode(const Content& content) { return content ? "+" + *content : "-"; }
Content Decode(const std::string& text) { return text.rfind('+', 0) == 0 ? Content(text.substr(1)) : Content(); }

Record IntentRecord(const std::string& change, std::int64_t time, const ChangeMessage& message, const std::string& path,
                    const Content& content) {
  return {Kind::kIntent, {change, std::to_string(time), FormatMessage(message), path, Encode(content)}};
}

// The files of a change are in the records of its intents.
Record CommitRecord(const std::string& change, const HistoryRepository::NewCommit& commit) {
  Record record{Kind::kCommit, {change, commit.author, commit.origin, std::to_string(commit.time), commit.message}};
  if (!change.empty()) return record;
  for (const auto& [path, content] : commit.files) {
    record.fields.push_back(path);
    record.fields.push_back(Encode(content));
  }
  return record;
}

// Whether these actions have no effect without changed files: a save reloads the service whatever it has changed.
bool ChangedNothing(const std::vector<std::string>& actions) {
  return std::all_of(actions.begin(), actions.end(),
                     [](const std::string& action) { return action == "reload: done"; });
}

Status Malformed() { return Status::Failure(kSyntax, "the journal of the history has an unknown record"); }

}  // namespace

History::History(Root root, const Store& store, Environment environment)
    : root_(std::move(root)),
      store_(store),
      environment_(std::move(environment)),
      journal_(Located(root_, kHistoryJournal)),
      missed_(Located(root_, kMissedChanges)) {}

void History::Intend(const std::string& path, std::optional<std::string_view> text) {
  if (!IsRecorded(path) || !IsOn()) return;
  const std::lock_guard lock(mutex_);
  try {
    const Status status = TryIntend(path, Shown(path, text));
    if (status.ok()) return;
    missed_.Add(path);
    Warn("The history has no record of a change of " + path, status);
  } catch (const std::bad_alloc&) {
    is_stale_ = true;
    throw;
  }
}

Status History::TryIntend(const std::string& path, const Content& content) {
  if (Status status = Load(); !status.ok()) return status;
  Mine& mine = ChangesOfThread()[this];
  const bool begins = open_.count(mine.name) == 0;
  if (begins) {
    mine.name.clear();
    if (Status status = CompleteOthers(); !status.ok()) return status;
  }
  if (Status status = CommitEdits({path}, begins); !status.ok()) return status;
  const std::string name = begins ? NewName() : mine.name;
  Open change = begins ? Open{DescribeCaller(), SecondsNow(), {}, false} : open_[name];
  Status status = journal_.Append(IntentRecord(name, change.time, change.message, path, content), true);
  if (!status.ok()) return status;
  mine.name = name;
  change.files[path] = content;
  open_[name] = std::move(change);
  return {};
}

void History::Settle(const std::string& path, const Status& status) {
  if (status.ok() || !IsRecorded(path)) return;
  const std::lock_guard lock(mutex_);
  const auto change = open_.find(ChangesOfThread()[this].name);
  if (change == open_.end() || change->second.files.count(path) == 0) return;
  // A replacement can fail after its effect: when the folder cannot be synced.
  const Result<StoredFile> present = store_.Read(path);
  if (present.ok() && Shown(path, present->content()) == change->second.files[path]) return;
  change->second.files.erase(path);
  const Status dropped = journal_.Append({Kind::kDropped, {change->first, path}}, false);
  if (!dropped.ok()) Warn("The history may show a change of " + path + " that failed", dropped);
}

void History::NoteAction(const std::string& action, const Status& status) {
  if (!IsOn()) return;
  ChangesOfThread()[this].actions.push_back(action + ": " + (status.ok() ? "done" : "failed, " + status.reason()));
}

void History::NoteUndo(const std::string& id) { ChangesOfThread()[this].undoes = id; }

// If there is no memory, the next change completes this one from the journal.
void History::End() noexcept {
  const auto mine = ChangesOfThread().find(this);
  if (mine == ChangesOfThread().end()) return;
  const std::lock_guard lock(mutex_);
  try {
    if (const Status status = TryEnd(); !status.ok()) Warn(kNotYet, status);
  } catch (const std::bad_alloc&) {
    is_stale_ = true;
  }
  repository_.reset();
  ChangesOfThread().erase(mine);
}

bool History::Postpone() {
  const auto mine = ChangesOfThread().find(this);
  return mine != ChangesOfThread().end() && !std::exchange(mine->second.is_postponed, true);
}

void History::Abandon(const Status& reason) noexcept {
  const std::lock_guard lock(mutex_);
  repository_.reset();
  ChangesOfThread().erase(this);
  try {
    Notice(std::string(kNotYet) + ": " + reason.reason());
  } catch (const std::bad_alloc&) {  // the next change completes this one all the same
  }
}

Status History::TryEnd() {
  const Mine& mine = ChangesOfThread()[this];
  if (mine.name.empty() && mine.actions.empty()) return {};
  if (Status status = Load(); !status.ok()) return status;
  const auto found = open_.find(mine.name);
  Open change = found == open_.end() ? Open{DescribeCaller(), SecondsNow(), {}, false} : found->second;
  change.is_rest = found == open_.end() && !mine.name.empty();
  change.message.actions = mine.actions;
  change.message.undoes = mine.undoes;
  if (!mine.undoes.empty()) change.message.kind = kUndo;
  const std::string name = mine.name.empty() ? NewName() : mine.name;
  if (Status status = Commit(name, std::move(change)); !status.ok()) return status;
  const bool is_due = commits_ >= kMostCommits || journal_.size() >= kLargestJournal;
  return is_due && open_.empty() ? Checkpoint() : Status();
}

void History::Recover(const std::vector<std::string>& paths) {
  if (!IsOn()) return;
  const std::lock_guard lock(mutex_);
  Status status = Load();
  if (status.ok()) status = CompleteOthers();
  if (status.ok()) status = CommitEdits(paths, true);
  repository_.reset();
  if (!status.ok()) Warn("The history cannot be brought up to date", status);
}

// Opens the repository, unless it is open since the begin of the change.
Status History::OpenRepository() {
  if (repository_) return {};
  Result<HistoryRepository> opened = HistoryRepository::Open(Located(root_, kHistoryFolder), true);
  if (!opened.ok()) return opened.status();
  repository_.emplace(std::move(*opened));
  return {};
}

// Reads what other processes have added to the journal. A process that begins a new journal may have removed commits.
Status History::Load() {
  if (std::exchange(is_stale_, false)) {
    journal_ = HistoryJournal(Located(root_, kHistoryJournal));
    open_.clear();
    repository_.reset();
  }
  bool is_new = false;
  const Result<std::vector<Record>> records = journal_.ReadNew(&is_new);
  if (!records.ok()) return records.status();
  if (is_new) repository_.reset();
  if (Status status = OpenRepository(); !status.ok()) return status;
  if (!is_new) return Replay(*records, false);
  open_.clear();
  checkpoint_.clear();
  commits_ = 0;
  if (records->empty()) return Checkpoint();
  const Record& first = records->front();
  if (first.kind != Kind::kCheckpoint || first.fields.size() < 2) return Malformed();
  checkpoint_ = first.fields[1];
  if (first.fields[0] == CurrentBoot()) return Replay(*records, false);
  // The system has been started again: what the commits since the checkpoint wrote need not have reached the disk.
  Status status = repository_->Reset(checkpoint_);
  if (status.ok()) status = Replay(*records, true);
  if (status.ok()) status = CompleteOthers();
  return status.ok() ? Checkpoint() : status;
}

// Follows the records. With `commits`, makes their commits again.
Status History::Replay(const std::vector<Record>& records, bool commits) {
  for (const Record& record : records) {
    Status status;
    if (record.kind == Kind::kIntent && record.fields.size() == 5) {
      Open& change = open_[record.fields[0]];
      change.time = std::strtoll(record.fields[1].c_str(), nullptr, 10);
      change.message = ParseMessage(record.fields[2]);
      change.files[record.fields[3]] = Decode(record.fields[4]);
    } else if (record.kind == Kind::kDropped && record.fields.size() == 2) {
      open_[record.fields[0]].files.erase(record.fields[1]);
    } else if (record.kind == Kind::kCommit && record.fields.size() >= 5) {
      if (commits && !record.fields[4].empty()) status = CommitAgain(record);
      open_.erase(record.fields[0]);
      ++commits_;
    } else if (record.kind != Kind::kCheckpoint) {
      status = Malformed();
    }
    if (!status.ok()) return status;
  }
  return {};
}

Status History::CommitAgain(const Record& record) {
  HistoryRepository::NewCommit commit{
      record.fields[1], record.fields[2], std::strtoll(record.fields[3].c_str(), nullptr, 10), record.fields[4], {}};
  for (const std::string& path : ParseMessage(commit.message).files) {
    const Files& files = open_[record.fields[0]].files;
    if (const auto file = files.find(path); file != files.end()) commit.files.insert(*file);
  }
  for (std::size_t i = 5; i + 1 < record.fields.size(); i += 2) {
    commit.files[record.fields[i]] = Decode(record.fields[i + 1]);
  }
  return repository_->Add(commit).status();
}

// Commits the open changes of other threads and processes, as far as they took effect.
Status History::CompleteOthers() {
  const std::string& mine = ChangesOfThread()[this].name;
  std::map<std::string, Open> others = open_;
  others.erase(mine);
  for (auto& [name, change] : others) {
    for (auto file = change.files.begin(); file != change.files.end();) {
      const Result<StoredFile> present = store_.Read(file->first);
      if (!present.ok()) return present.status();
      file = Shown(file->first, present->content()) == file->second ? std::next(file) : change.files.erase(file);
    }
    if (Status status = Commit(name, std::move(change)); !status.ok()) return status;
  }
  return {};
}

// Commits the edits by hand of these files, and with `all` of every file of the history.
Status History::CommitEdits(const std::vector<std::string>& paths, bool all) {
  std::set<std::string> checked(paths.begin(), paths.end());
  const Result<std::string> tip = repository_->Tip();
  if (!tip.ok()) return tip.status();
  if (all) {
    const Result<std::vector<std::string>> known = repository_->Paths(*tip);
    if (!known.ok()) return known.status();
    checked.insert(known->begin(), known->end());
  }
  for (const std::string& path : checked) {
    if (!IsRecorded(path) || IsOpen(path)) continue;
    if (Status status = CommitEdit(path); !status.ok()) return status;
  }
  return {};
}

bool History::IsOpen(const std::string& path) const {
  return std::any_of(open_.begin(), open_.end(),
                     [&](const auto& change) { return change.second.files.count(path) != 0; });
}

Status History::CommitEdit(const std::string& path) {
  const Result<Version> version = store_.VersionOf(path);
  const auto recorded = recorded_.find(path);
  if (version.ok() && recorded != recorded_.end() && recorded->second == *version) return {};
  const Result<StoredFile> file = store_.Read(path);
  if (!file.ok()) return {};  // whoever changes it fails, too
  const Result<std::string> tip = repository_->Tip();
  if (!tip.ok()) return tip.status();
  const Content content = Shown(path, file->content());
  if (!repository_->Has(*tip, path, content)) {
    Open edit{{}, SecondsNow(), {{path, content}}, false};
    edit.message.kind = repository_->Has(*tip, path, Content()) ? kFound : kByHand;
    if (missed_.Has(path)) edit.message.kind = kUnrecorded;
    if (Status status = Commit("", std::move(edit)); !status.ok()) return status;
  }
  missed_.Remove(path);
  // A file that is missing has the same version as before it was created.
  if (file->is_settled && file->version.exists) recorded_[path] = file->version;
  return {};
}

// Makes a commit of what differs from the newest one, and closes the change.
Status History::Commit(const std::string& name, Open change) {
  const Result<std::string> tip = repository_->Tip();
  if (!tip.ok()) return tip.status();
  HistoryRepository::NewCommit commit;
  for (auto& [path, content] : change.files) {
    if (repository_->Has(*tip, path, content)) continue;
    change.message.files.push_back(path);
    commit.files.emplace(path, std::move(content));
  }
  const bool is_empty = commit.files.empty() &&
                        (change.message.actions.empty() || (!change.is_rest && ChangedNothing(change.message.actions)));
  commit.author = change.message.caller.empty() ? change.message.kind : change.message.caller;
  commit.origin = change.message.origin;
  commit.time = change.time;
  commit.message = is_empty ? "" : FormatMessage(change.message);
  if (!is_empty) {
    if (const Result<std::string> added = repository_->Add(commit); !added.ok()) return added.status();
    ++commits_;
  }
  if (!is_empty || open_.count(name) != 0) {  // without a message the record only closes the change
    if (Status status = journal_.Append(CommitRecord(name, commit), false); !status.ok()) return status;
  }
  open_.erase(name);
  return {};
}

Status History::Checkpoint() {
  const Result<std::string> tip = repository_->Tip();
  if (!tip.ok()) return tip.status();
  if (Status status = repository_->Pack(checkpoint_, environment_.settings().most_changes); !status.ok()) return status;
  malloc_trim(0);  // packing takes megabytes, which the allocator of a server would keep
  const Record record{Kind::kCheckpoint, {CurrentBoot(), *tip, std::to_string(NanosecondsNow())}};
  if (Status status = journal_.Restart(record); !status.ok()) return status;
  checkpoint_ = *tip;
  commits_ = 0;
  return {};
}

Content History::Shown(const std::string& path, std::optional<std::string_view> text) const {
  if (!text) return std::nullopt;
  return environment_.shown(path, std::string(*text));
}

// The records that were read of the journal are perhaps not applied.
void History::Warn(const std::string& what, const Status& status) {
  is_stale_ = true;
  Notice(what + ": " + status.reason());
}

Status History::Walk(const std::function<bool(const Change&)>& visit) const {
  const Result<HistoryRepository> repository = HistoryRepository::Open(Located(root_, kHistoryFolder), false);
  if (!repository.ok()) return repository.status().code() == ENOENT ? Status() : repository.status();
  return repository->Walk([&](const HistoryRepository::Commit& commit) {
    return visit({commit.id, commit.time, ParseMessage(commit.message)});
  });
}

Result<History::Change> History::Read(const std::string& id) const {
  const Result<HistoryRepository> repository = HistoryRepository::Open(Located(root_, kHistoryFolder), false);
  if (!repository.ok()) return repository.status();
  const Result<HistoryRepository::Commit> commit = repository->Read(id);
  if (!commit.ok()) return commit.status();
  return Change{commit->id, commit->time, ParseMessage(commit->message)};
}

Result<std::vector<History::ChangedFile>> History::FilesOf(const Change& change) const {
  const Result<HistoryRepository> repository = HistoryRepository::Open(Located(root_, kHistoryFolder), false);
  if (!repository.ok()) return repository.status();
  const Result<HistoryRepository::Commit> commit = repository->Read(change.id);
  if (!commit.ok()) return commit.status();
  if (commit->is_cut) return Status::Failure(kUnsupported, change.id + " is the oldest change that is kept");
  std::vector<ChangedFile> files;
  for (const std::string& path : change.message.files) {
    Result<Content> before = repository->ContentAt(commit->parent, path);
    if (!before.ok()) return before.status();
    Result<Content> after = repository->ContentAt(commit->id, path);
    if (!after.ok()) return after.status();
    files.push_back({path, std::move(*before), std::move(*after)});
  }
  return files;
}

}  // namespace vorn
