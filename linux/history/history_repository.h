// The git repository of the history, through libgit2. git(1) can read it at any time.
#ifndef VORN_LINUX_HISTORY_HISTORY_REPOSITORY_H
#define VORN_LINUX_HISTORY_HISTORY_REPOSITORY_H

#include <cstdint>
#include <functional>
#include <map>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "status.h"

struct git_repository;

namespace vorn {

// A bare repository with one branch, "main", whose commits have one parent each. The tree of a commit has the files of
// the box at their paths: "etc/exports" is /etc/exports. A commit is named by its object id, 40 hexadecimal digits; an
// empty string stands for no commit.
//
// A function calls fsync(2) only if its comment says so; the journal (history_journal.h) restores what a loss of power
// takes. An object is used by one thread. Several threads and processes may have an object each for one repository, but
// only one of them may write at a time. An object does not notice when another one removes old commits.
class HistoryRepository {
 public:
  using Content = std::optional<std::string>;    // nullopt: the file does not exist
  using Files = std::map<std::string, Content>;  // by path on the box

  struct Commit {
    std::string id;
    std::string parent;     // empty: there is none, or it was removed
    bool is_cut = false;    // whether the parent was removed
    std::int64_t time = 0;  // seconds since the epoch
    std::string message;
  };

  // Opens the repository at `location`, a path of this system; creates it, with mode 0700, if there is none and
  // `create` is set. Fails with ENOENT if there is none.
  static Result<HistoryRepository> Open(const std::string& location, bool create);

  // The newest commit.
  Result<std::string> Tip() const;

  // Reads a commit. Fails with ENOENT if there is none with this id.
  Result<Commit> Read(const std::string& id) const;

  // The content of a file in a commit.
  Result<Content> ContentAt(const std::string& commit, const std::string& path) const;

  // Whether the file has this content in the commit. Reads no content.
  bool Has(const std::string& commit, const std::string& path, const Content& content) const;

  // The paths of all files in a commit, sorted.
  Result<std::vector<std::string>> Paths(const std::string& commit) const;

  struct NewCommit {
    std::string author;  // of the signature: a name
    std::string origin;  // in place of the author's electronic mail address
    std::int64_t time = 0;
    std::string message;
    Files files;  // that differ from the parent
  };

  // Adds a commit to the branch. Equal arguments on an equal tip give an equal id.
  Result<std::string> Add(const NewCommit& commit);

  // Calls `visit` with the commits of the branch, newest first, until it returns false.
  Status Walk(const std::function<bool(const Commit&)>& visit) const;

  // Moves everything since the commit `since`, which earlier packs contain, into a pack, durably. If there are many
  // packs then, they become one with the newest `most` commits; older ones are removed, and the file "shallow"
  // (gitrepository-layout(5)) ends the branch before them.
  Status Pack(const std::string& since, std::size_t most);

  // Makes `tip` the newest commit, without any object that is not in a pack: after a crash those may be damaged.
  Status Reset(const std::string& tip);

 private:
  struct Close {
    void operator()(git_repository* repository) const;
  };

  HistoryRepository(std::string location, git_repository* repository);

  Status PackFrom(const std::function<bool(const Commit&)>& is_wanted, Commit* last);
  Status Consolidate(std::size_t most);
  Status SyncPacks() const;
  void RemoveLooseObjects() const;
  Result<std::string> SetTip(const std::string& id);

  std::string location_;
  std::unique_ptr<git_repository, Close> repository_;
  std::string oldest_;  // the commit whose parents were removed; empty: there is none
};

}  // namespace vorn

#endif  // VORN_LINUX_HISTORY_HISTORY_REPOSITORY_H
