// A store whose writes stay in memory: the files of a rehearsal.
#ifndef VORN_LINUX_BOX_DRAFT_STORE_H
#define VORN_LINUX_BOX_DRAFT_STORE_H

#include <cstdint>
#include <map>
#include <mutex>
#include <optional>
#include <string>
#include <vector>

#include "store.h"

namespace vorn {

// Reads through to another store and never writes to it.
//
// The first read of a file or folder is its snapshot: later changes of the other store are not seen. Paths that lead to
// one file, because of symbolic links, have one snapshot. A file that was read and not written has the version of the
// other store. A file that was written here, and a folder in which a file was created or removed, has a version of the
// draft's own, which equals no version of the other store.
//
// Locks exclude nobody and are always free: a draft belongs to one call. Nothing that depends on the disk is foreseen:
// Replace() also succeeds where the other store would fail because it is full, read-only or locked.
class DraftStore : public Store {
 public:
  // A file whose content differs from its snapshot; nullopt where it does not exist.
  struct ChangedFile {
    std::string path;
    std::optional<std::string> before;
    std::optional<std::string> after;
  };

  // `stored` outlives this object.
  explicit DraftStore(const Store& stored) : stored_(stored) {}

  // Returns the files that were changed, in the order of their paths.
  std::vector<ChangedFile> Changes() const;

  Result<StoredFile> Read(const std::string& path) const override;
  Result<Version> VersionOf(const std::string& path) const override;
  Result<StoredFolder> List(const std::string& folder) const override;
  Result<Version> Replace(const std::string& path, std::string_view text, const Version& expected,
                          unsigned mode) override;
  Status Remove(const std::string& path, const Version& expected) override;
  Status Confirm(const std::string& path) override;
  Status SetMode(const std::string& path, unsigned mode) override;
  Status MakeFolder(const std::string& path) override;
  Result<std::unique_ptr<HeldLock>> Lock(const std::string& name, std::chrono::milliseconds limit) override;

 private:
  struct File {
    StoredFile snapshot;
    StoredFile now;
    std::string written_as;  // the path of the first write; empty: not written
  };

  Result<File*> Find(const std::string& path) const;
  Result<Version> Write(const std::string& path, std::optional<std::string> text, const Version& expected);
  Version NextVersion();

  const Store& stored_;
  mutable std::mutex mutex_;
  mutable std::map<std::string, std::string> locations_;  // path to location
  mutable std::map<std::string, File> files_;             // by location
  mutable std::map<std::string, StoredFolder> folders_;   // snapshots
  std::map<std::string, Version> changed_folders_;        // those that have gained or lost a file
  std::uint64_t versions_ = 0;
};

}  // namespace vorn

#endif  // VORN_LINUX_BOX_DRAFT_STORE_H
