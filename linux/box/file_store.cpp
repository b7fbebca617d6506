#include "file_store.h"

#include <sys/stat.h>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <mutex>
#include <utility>

#include "file_lock.h"
#include "files.h"

namespace vorn {
namespace {

class HeldFileLock : public HeldLock {
 public:
  explicit HeldFileLock(FileDescriptor file) : file_(std::move(file)) {}

 private:
  const FileDescriptor file_;
};

std::uint64_t Word(std::int64_t number) { return static_cast<std::uint64_t>(number); }

Version VersionFrom(const FileStamp& stamp) {
  if (!stamp.exists) return {};
  return {true, {stamp.device, stamp.inode, Word(stamp.size), Word(stamp.modified), Word(stamp.changed)}};
}

FileStamp StampFrom(const Version& version) {
  if (!version.exists) return {};
  FileStamp stamp{};
  stamp.exists = true;
  stamp.device = version.state[0];
  stamp.inode = version.state[1];
  stamp.size = static_cast<off_t>(version.state[2]);
  stamp.modified = static_cast<std::int64_t>(version.state[3]);
  stamp.changed = static_cast<std::int64_t>(version.state[4]);
  return stamp;
}

Result<Version> VersionAt(const std::string& location) {
  const Result<FileStamp> stamp = StampOfFile(location);
  if (!stamp.ok()) return stamp.status();
  return VersionFrom(*stamp);
}

std::string PathBelow(const Root& root, const std::string& path) {
  return root.is_box() ? path : root.directory() + path;
}

}  // namespace

// Remembers which paths have no symbolic links.
Result<std::string> FileStore::Locate(const std::string& path) const {
  Result<std::string> location = root_.Locate(path);
  if (!location.ok()) return location;
  const std::lock_guard lock(mutex_);
  if (*location == PathBelow(root_, path)) {
    plain_paths_[path] = std::make_shared<const std::string>(*location);
  } else {
    plain_paths_.erase(path);
  }
  return location;
}

// The location of a path without symbolic links; nullptr if it has some, or is not known yet.
std::shared_ptr<const std::string> FileStore::KnownLocation(const std::string& path) const {
  const std::shared_lock lock(mutex_);
  const auto known = plain_paths_.find(path);
  return known == plain_paths_.end() ? nullptr : known->second;
}

Result<StoredFile> FileStore::Read(const std::string& path) const {
  Result<std::string> location = Locate(path);
  if (!location.ok()) return location.status();
  const std::int64_t now = FileClock();
  Result<FileText> file = ReadFileOrNothing(*location);
  if (!file.ok()) return file.status();
  return StoredFile{std::move(*location), std::move(file->text), VersionFrom(file->stamp), IsSettled(file->stamp, now)};
}

Result<Version> FileStore::VersionOf(const std::string& path) const {
  if (const std::shared_ptr<const std::string> location = KnownLocation(path)) return VersionAt(*location);
  const Result<std::string> location = Locate(path);
  return location.ok() ? VersionAt(*location) : location.status();
}

Result<StoredFolder> FileStore::List(const std::string& folder) const {
  const Result<std::string> location = Locate(folder);
  if (!location.ok()) return location.status();
  const std::int64_t now = FileClock();
  const Result<FileStamp> stamp = StampOfFile(*location);
  if (!stamp.ok()) return stamp.status();
  Result<std::vector<std::string>> names = ListFolder(*location);
  if (!names.ok()) return names.status();
  std::sort(names->begin(), names->end(),
            [](const std::string& a, const std::string& b) { return strverscmp(a.c_str(), b.c_str()) < 0; });
  return StoredFolder{std::move(*names), VersionFrom(*stamp), IsSettled(*stamp, now)};
}

Result<Version> FileStore::Replace(const std::string& path, std::string_view text, const Version& expected,
                                   unsigned mode) {
  const Result<std::string> location = Locate(path);
  if (!location.ok()) return location.status();
  const Result<FileStamp> written = ReplaceFile(*location, text, StampFrom(expected), mode);
  if (!written.ok()) return written.status();
  return VersionFrom(*written);
}

Status FileStore::Remove(const std::string& path, const Version& expected) {
  const Result<std::string> location = Locate(path);
  return location.ok() ? RemoveFile(*location, StampFrom(expected)) : location.status();
}

Status FileStore::Confirm(const std::string& path) {
  const Result<std::string> location = Locate(path);
  return location.ok() ? ConfirmFile(*location) : location.status();
}

Status FileStore::SetMode(const std::string& path, unsigned mode) {
  const Result<std::string> location = Locate(path);
  if (!location.ok()) return location.status();
  if (chmod(location->c_str(), mode) == 0 || errno == ENOENT) return {};
  return Status::System(errno, *location);
}

Status FileStore::MakeFolder(const std::string& path) {
  const Result<std::string> location = Locate(path);
  return location.ok() ? MakeFolders(*location) : location.status();
}

Result<std::unique_ptr<HeldLock>> FileStore::Lock(const std::string& name, std::chrono::milliseconds limit) {
  Result<FileDescriptor> file = TakeFileLock(root_, name, limit);
  if (!file.ok()) return file.status();
  return std::unique_ptr<HeldLock>(std::make_unique<HeldFileLock>(std::move(*file)));
}

}  // namespace vorn
