// The files of a box below a root folder of this system.
#ifndef VORN_LINUX_BOX_FILE_STORE_H
#define VORN_LINUX_BOX_FILE_STORE_H

#include <memory>
#include <shared_mutex>
#include <string>
#include <unordered_map>

#include "root.h"
#include "store.h"

namespace vorn {

// A version is the file's device, inode, size, mtime and ctime (stat(2)), so an edit by any program gives a
// new one. The limits of that check:
//  - An edit within the clock tick (jiffy) of the version before, of the same size and in place, has the same
//    version; so does one within the same second where the file system stores whole seconds. Such a file is not
//    "settled" (IsSettled in files.h), so no reader keeps it; a writer may miss that one edit.
//  - On a root that is not "/", a folder that becomes a symbolic link is noticed only if the file behind it
//    differs; "absent" and "absent" do not differ. Nothing below a trial root does that while it is used.
class FileStore : public Store {
 public:
  explicit FileStore(Root root) : root_(std::move(root)) {}

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
  Result<std::string> Locate(const std::string& path) const;
  std::shared_ptr<const std::string> KnownLocation(const std::string& path) const;

  const Root root_;
  mutable std::shared_mutex mutex_;
  // The locations of paths that were seen to lead to their file without a symbolic link: their version is one lstat(2).
  mutable std::unordered_map<std::string, std::shared_ptr<const std::string>> plain_paths_;
};

}  // namespace vorn

#endif  // VORN_LINUX_BOX_FILE_STORE_H
