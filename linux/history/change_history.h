// The history of a box: who changed which of its files, when, and how.
#ifndef VORN_LINUX_HISTORY_CHANGE_HISTORY_H
#define VORN_LINUX_HISTORY_CHANGE_HISTORY_H

#include <cstdint>
#include <functional>
#include <map>
#include <memory>
#include <mutex>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "change_message.h"
#include "change_recorder.h"
#include "history_journal.h"
#include "history_repository.h"
#include "missed_changes.h"
#include "root.h"
#include "store.h"

namespace vorn {

inline constexpr char kHistoryFolder[] = "/var/lib/vorn/history.git";
inline constexpr char kHistoryJournal[] = "/var/lib/vorn/history.journal";

// Records the files below /etc that the platform changes. Files in which it only remembers something are not recorded.
//
// Before a file is replaced, its new content and the description of the change are durable in the journal. When the
// change ends, it becomes a commit. A process that dies in between leaves an open change; whoever changes the box next,
// or starts, makes a commit of those of its files that have the recorded content by then. A change whose thread has
// released the configuration lock for a service operation is open as well; the next writer commits its files, and its
// service operation becomes a commit of its own.
//
// A file that differs from the newest commit, and from the open changes, was edited by hand; that becomes a commit of
// its own before the next change. Thread-safe.
class History : public ChangeRecorder {
 public:
  struct Settings {
    bool is_on = false;
    std::size_t most_changes = 2000;  // as PlatformSettings
  };

  struct Environment {
    std::function<Settings()> settings;
    // Returns what is recorded of a file with this content. It must not contain secrets.
    std::function<std::string(const std::string& path, const std::string& content)> shown;
  };

  // `store` has the files of the box and outlives the object.
  History(Root root, const Store& store, Environment environment);

  bool IsOn() override { return environment_.settings().is_on; }
  void Intend(const std::string& path, std::optional<std::string_view> text) override;
  void Settle(const std::string& path, const Status& status) override;
  void NoteAction(const std::string& action, const Status& status) override;
  void End() noexcept override;
  bool Postpone() override;
  void Abandon(const Status& reason) noexcept override;

  // Says that the change of this thread takes back the change `id`.
  void NoteUndo(const std::string& id);

  // Commits what a killed process left, and the edits by hand of these files. For the start of a server; the caller
  // owns the configuration lock.
  void Recover(const std::vector<std::string>& paths);

  struct Change {
    std::string id;
    std::int64_t time = 0;  // seconds since the epoch
    ChangeMessage message;
  };
  struct ChangedFile {
    std::string path;
    HistoryRepository::Content before;
    HistoryRepository::Content after;
  };

  // Calls `visit` with the changes, newest first, until it returns false. Needs no lock.
  Status Walk(const std::function<bool(const Change&)>& visit) const;

  // Reads a change. Fails with ENOENT if the history has none with this id.
  Result<Change> Read(const std::string& id) const;

  // Returns the files of a change as they were before and after it. Of the oldest change whose predecessors were
  // removed, nothing is known from before: fails with kUnsupported.
  Result<std::vector<ChangedFile>> FilesOf(const Change& change) const;

 private:
  using Content = HistoryRepository::Content;
  using Files = HistoryRepository::Files;

  // The change of a thread that is not committed yet, or of a process that died.
  struct Open {
    ChangeMessage message;
    std::int64_t time = 0;
    Files files;
    bool is_rest = false;  // whether another writer has committed its files, so that its actions are left
  };

  Status TryIntend(const std::string& path, const Content& content);
  Status TryEnd();
  Status OpenRepository();
  Status Load();
  Status Replay(const std::vector<HistoryJournal::Record>& records, bool commits);
  Status CommitAgain(const HistoryJournal::Record& record);
  Status CompleteOthers();
  Status CommitEdits(const std::vector<std::string>& paths, bool all);
  Status CommitEdit(const std::string& path);
  Status Commit(const std::string& name, Open change);
  Status Checkpoint();
  bool IsOpen(const std::string& path) const;
  Content Shown(const std::string& path, std::optional<std::string_view> text) const;
  void Warn(const std::string& what, const Status& status);

  const Root root_;
  const Store& store_;
  const Environment environment_;
  mutable std::mutex mutex_;
  HistoryJournal journal_;
  std::optional<HistoryRepository> repository_;  // open from the first file of a change to its end
  std::map<std::string, Open> open_;             // by the name of the change
  std::map<std::string, Version> recorded_;      // versions whose content is in the history
  bool is_stale_ = false;                        // whether the state must be read again from the begin of the journal
  MissedChanges missed_;
  std::string checkpoint_;   // the newest commit at the begin of the journal
  std::size_t commits_ = 0;  // since then
};

}  // namespace vorn

#endif  // VORN_LINUX_HISTORY_CHANGE_HISTORY_H
